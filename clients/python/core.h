// SPDX-License-Identifier: Apache-2.0
// The parts of neuralwarp._core, in the order in which they are added.
#pragma once

#include <pybind11/pybind11.h>

namespace neuralWarp::python {

void addModels(pybind11::module_& module);
void addDeformers(pybind11::module_& module);
void addCharacters(pybind11::module_& module);
void addSurfaces(pybind11::module_& module);

} // namespace neuralWarp::python
