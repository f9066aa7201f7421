// SPDX-License-Identifier: Apache-2.0
#include "python/arrays.h"

#include <algorithm>
#include <cstdint>
#include <string_view>

namespace neuralWarp::python {

namespace py = pybind11;

namespace {

constexpr int alignedFlag = py::detail::npy_api::NPY_ARRAY_ALIGNED_;

std::string textOf(const Shape& shape) {
    std::string text = "[";
    for (const py::ssize_t length : shape)
        text += (text.size() > 1 ? ", " : "") + (length == anyLength ? "any" : std::to_string(length));
    return text + "]";
}

std::string shapeTextOf(const py::array& array) {
    return textOf({array.shape(), array.shape() + array.ndim()});
}

std::string typeTextOf(const py::array& array) {
    return py::str(static_cast<py::object>(array.dtype()));
}

[[noreturn]] void refuse(const std::string& name, const std::string& expected, const std::string& got) {
    throw py::value_error(name + ": expected " + expected + ", got " + got);
}

void checkShape(const py::array& array, const std::string& name, const Shape& shape) {
    bool fits = array.ndim() == static_cast<py::ssize_t>(shape.size());
    for (std::size_t i = 0; fits && i < shape.size(); ++i)
        fits = shape[i] == anyLength || shape[i] == array.shape(static_cast<py::ssize_t>(i));
    if (!fits)
        refuse(name, "the shape " + textOf(shape), shapeTextOf(array));
}

/// `kinds` of types, as NumPy's dtype.kind has them.
py::array arrayOf(py::handle value, const std::string& name, const Shape& shape, std::string_view kinds,
                  const std::string& expected) {
    py::array array = py::array::ensure(value);
    if (!array)
        refuse(name, expected + " " + textOf(shape), "a " + std::string(py::str(py::type::of(value).attr("__name__"))));
    if (kinds.find(array.dtype().kind()) == std::string_view::npos && array.size() != 0)
        refuse(name, expected, typeTextOf(array));
    checkShape(array, name, shape);
    return array;
}

template <class Array>
Array converted(const py::array& array, const std::string& name) {
    Array own = Array::ensure(array);
    if (!own)
        refuse(name, "numbers that can be converted", typeTextOf(array));
    if ((own.flags() & alignedFlag) == 0)
        own = Array::ensure(own.attr("copy")());
    return own;
}

} // namespace

FloatArray floatsOf(py::handle value, const std::string& name, const Shape& shape) {
    return converted<FloatArray>(arrayOf(value, name, shape, "fiu", "real numbers (float32)"), name);
}

IndexArray indicesOf(py::handle value, const std::string& name, const Shape& shape) {
    return converted<IndexArray>(arrayOf(value, name, shape, "iu", "whole numbers"), name);
}

FloatArray resultIn(py::handle out, const std::string& name, const Shape& shape) {
    if (out.is_none())
        return FloatArray(shape);
    const std::string expected = "None or a writable C-contiguous float32 array " + textOf(shape);
    if (!py::isinstance<py::array>(out))
        refuse(name, expected, "a " + std::string(py::str(py::type::of(out).attr("__name__"))));
    const auto array = py::reinterpret_borrow<py::array>(out);
    if (!FloatArray::check_(array))
        refuse(name, expected, "one of " + typeTextOf(array) + (array.flags() & py::array::c_style ? "" : ", strided"));
    checkShape(array, name, shape);
    if (!array.writeable() || (array.flags() & alignedFlag) == 0)
        refuse(name, expected, array.writeable() ? "one that is not aligned" : "one that is read-only");
    return py::reinterpret_borrow<FloatArray>(out);
}

void checkApart(const std::vector<NamedArray>& arrays) {
    struct Extent {
        std::uintptr_t begin, end;
        const NamedArray* of;
    };
    std::vector<Extent> extents;
    for (const NamedArray& named : arrays)
        if (named.array.nbytes() > 0) {
            const auto begin = reinterpret_cast<std::uintptr_t>(named.array.data());
            extents.push_back({begin, begin + static_cast<std::uintptr_t>(named.array.nbytes()), &named});
        }
    std::sort(extents.begin(), extents.end(), [](const Extent& a, const Extent& b) { return a.begin < b.begin; });
    // whoever begins before the furthest end so far lies in that one
    const Extent* furthest = nullptr;    // of all
    const Extent* furthestOut = nullptr; // of the results
    for (const Extent& extent : extents) {
        const Extent* const before = extent.of->isOut ? furthest : furthestOut;
        if (before && extent.begin < before->end) {
            const NamedArray* const out = extent.of->isOut ? extent.of : before->of;
            const NamedArray* const other = out == extent.of ? before->of : extent.of;
            throw py::value_error(out->name + ": expected memory of its own, got some of " + other->name);
        }
        if (!furthest || extent.end > furthest->end)
            furthest = &extent;
        if (extent.of->isOut && (!furthestOut || extent.end > furthestOut->end))
            furthestOut = &extent;
    }
}

} // namespace neuralWarp::python
