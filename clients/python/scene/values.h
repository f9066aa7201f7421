// SPDX-License-Identifier: Apache-2.0
// The values of plugs as Python has them.
#pragma once

#include "openquarn/HPlug.h"
#include "python/scene/OpenScene.h"

#include <pybind11/numpy.h>
#include <pybind11/pybind11.h>

#include <optional>
#include <string>
#include <vector>

namespace python {

using FloatArray = pybind11::array_t<float, pybind11::array::c_style>;

/// The plug that a name means, a slider's too. Throws std::invalid_argument.
HPlug plugNamed(const std::string& name);

/// Whether the plug holds one number.
bool isNumber(const HPlug& plug);
/// Whether it takes any finite one, brought between the attribute's limits.
bool isReal(const HPlug& plug);
/// Sets one that is real. Throws std::invalid_argument when the number is not finite, and when the plug cannot be set.
void setReal(const HPlug& plug, double number);

/// Evaluates it. A number is int, float or bool as its attribute is, a text str, a matrix float64 [4, 4] for row
/// vectors, a mesh its points, a list and an array of numbers or texts a list, a compound the list of its children;
/// None where there is no value. Throws std::invalid_argument for a kind that Python has nothing for,
/// std::runtime_error when it cannot be evaluated.
pybind11::object valueOf(Visit& visit, const HPlug& plug);

/// Sets it from such a value; arrays and compounds part by part, an array from element 0 on. Throws
/// pybind11::type_error, naming the type, when it is of another kind, std::invalid_argument when the plug does not take
/// it.
void setValue(OpenScene& scene, const HPlug& plug, const pybind11::handle& value);

/// Evaluates a plug that holds a mesh: x, y, z of each vertex, float32 [vertices, 3], in the scene's unit and the
/// mesh's space. `out` an array of that shape to write into, or none. Throws std::invalid_argument for another plug and
/// another `out`, std::runtime_error when it cannot be evaluated, and when a coordinate is not finite.
FloatArray pointsOf(Visit& visit, const HPlug& plug, const std::optional<pybind11::array>& out);

/// The array as one that can be written into, of that shape. `name` what errors call it.
FloatArray writable(const pybind11::array& array, const std::vector<pybind11::ssize_t>& shape, const char* name);

} // namespace python
