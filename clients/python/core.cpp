// SPDX-License-Identifier: Apache-2.0
// neuralwarp._core: models and meshes, without a host.
#include "python/core.h"

#include "nw_deform/Model.h"

namespace {

// pybind11 turns what the libraries throw into exceptions of Python, std::invalid_argument into ValueError; this it
// does not know
void translate(std::exception_ptr failure) {
    try {
        if (failure)
            std::rethrow_exception(failure);
    } catch (const neuralWarp::FileMissing& error) {
        PyErr_SetString(PyExc_FileNotFoundError, error.what());
    }
}

} // namespace

PYBIND11_MODULE(_core, module) {
    module.doc() = "Models and meshes, without a host.";
    module.attr("version") = NW_VERSION;
    pybind11::register_local_exception_translator(&translate);
    pybind11::options options;
    options.disable_function_signatures(); // the stubs have them
    neuralWarp::python::addModels(module);
    neuralWarp::python::addDeformers(module);
    neuralWarp::python::addCharacters(module);
    neuralWarp::python::addSurfaces(module);
}
