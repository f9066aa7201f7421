// SPDX-License-Identifier: Apache-2.0
// neuralwarp._core: models and meshes, without a host.
#include <pybind11/pybind11.h>

PYBIND11_MODULE(_core, module) {
    module.doc() = "Models and meshes, without a host.";
    module.attr("version") = NW_VERSION;
}
