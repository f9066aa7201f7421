// SPDX-License-Identifier: Apache-2.0
// Arrays of NumPy as the libraries take them. What does not fit is a ValueError that names the argument, what was
// expected and what was got. With the GIL.
#pragma once

#include <pybind11/numpy.h>

#include <cstdint>
#include <string>
#include <vector>

namespace neuralWarp::python {

using FloatArray = pybind11::array_t<float, pybind11::array::c_style | pybind11::array::forcecast>;
using IndexArray = pybind11::array_t<std::int64_t, pybind11::array::c_style | pybind11::array::forcecast>;

/// The length of each dimension; anyLength for one that may be any.
using Shape = std::vector<pybind11::ssize_t>;
inline constexpr pybind11::ssize_t anyLength = -1;

/// Something like an array of real numbers: itself where it is float32, C-contiguous and aligned, else a copy.
FloatArray floatsOf(pybind11::handle value, const std::string& name, const Shape& shape);
/// Something like an array of whole numbers, likewise.
IndexArray indicesOf(pybind11::handle value, const std::string& name, const Shape& shape);

/// Where a result goes: a new array for None, else `out` itself, which must be float32, C-contiguous and writable.
FloatArray resultIn(pybind11::handle out, const std::string& name, const Shape& shape);

/// Name of the type of an object, for a message.
std::string typeNameOf(pybind11::handle value);

/// An argument, for checkApart().
struct NamedArray {
    const pybind11::array& array;
    std::string name;
    bool isOut;
};

/// Throws unless the memory of every result is apart from that of all others.
void checkApart(const std::vector<NamedArray>& arrays);

} // namespace neuralWarp::python
