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

/// "float64 [3, 2]"
std::string textOf(const py::array& array) {
    return std::string(py::str(static_cast<py::object>(array.dtype()))) + " " +
           textOf({array.shape(), array.shape() + array.ndim()});
}

[[noreturn]] void refuse(const std::string& name, const std::string& expected, const std::string& got) {
    throw py::value_error(name + ": expected " + expected + ", got " + got);
}

bool fits(const py::array& array, const Shape& shape) {
    if (array.ndim() != static_cast<py::ssize_t>(shape.size()))
        return false;
    for (std::size_t i = 0; i < shape.size(); ++i)
        if (shape[i] != anyLength && shape[i] != array.shape(static_cast<py::ssize_t>(i)))
            return false;
    return true;
}

/// `kinds` of types, as NumPy's dtype.kind has them, any of which becomes `expected`.
py::array arrayOf(py::handle value, const std::string& name, const Shape& shape, std::string_view kinds,
                  const char* expected) {
    py::array array = py::array::ensure(value);
    const auto wanted = [&] { return std::string(expected) + " " + textOf(shape); };
    if (!array)
        refuse(name, wanted(), "a " + typeNameOf(value));
    // a list of nothing is of floats
    const bool isOfKind = kinds.find(array.dtype().kind()) != std::string_view::npos || array.size() == 0;
    if (!isOfKind || !fits(array, shape))
        refuse(name, wanted(), textOf(array));
    return array;
}

template <class Array>
Array converted(const py::array& array, const std::string& name) {
    Array own = Array::ensure(array);
    if (!own)
        refuse(name, "numbers that can be converted", textOf(array));
    if ((own.flags() & alignedFlag) == 0)
        own = Array::ensure(own.attr("copy")());
    return own;
}

} // namespace

std::string typeNameOf(py::handle value) {
    return py::str(py::type::of(value).attr("__name__"));
}

FloatArray floatsOf(py::handle value, const std::string& name, const Shape& shape) {
    return converted<FloatArray>(arrayOf(value, name, shape, "fiu", "float32"), name);
}

IndexArray indicesOf(py::handle value, const std::string& name, const Shape& shape) {
    return converted<IndexArray>(arrayOf(value, name, shape, "iu", "whole numbers"), name);
}

FloatArray resultIn(py::handle out, const std::string& name, const Shape& shape) {
    if (out.is_none())
        return FloatArray(shape);
    const auto refuseOut = [&](const std::string& got) {
        refuse(name, "a writable C-contiguous float32 " + textOf(shape), got);
    };
    if (!py::isinstance<py::array>(out))
        refuseOut("a " + typeNameOf(out));
    const auto array = py::reinterpret_borrow<py::array>(out);
    if (!py::isinstance<py::array_t<float>>(array) || !fits(array, shape))
        refuseOut(textOf(array));
    if ((array.flags() & py::array::c_style) == 0)
        refuseOut("one with gaps or of another order");
    if (!array.writeable())
        refuseOut("one that is read-only");
    if ((array.flags() & alignedFlag) == 0)
        refuseOut("one that is not aligned");
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
    std::stable_sort(extents.begin(), extents.end(),
                     [](const Extent& a, const Extent& b) { return a.begin < b.begin; });
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
