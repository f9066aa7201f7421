// SPDX-License-Identifier: Apache-2.0
#include "python/scene/Plugs.h"

#include "python/scene/values.h"
#include "quarn/scene/plugs.h"

#include <cmath>
#include <stdexcept>
#include <utility>

namespace python {
namespace {

namespace py = pybind11;

// then nothing that depends on it has to be computed anew
bool hasAlready(const HPlug& plug, double value) {
    HStatus status;
    const double present = plug.asDouble(&status);
    return present == value && !status.error() && std::signbit(present) == std::signbit(value);
}

} // namespace

Plugs::Plugs(std::shared_ptr<OpenScene> scene, std::vector<std::string> names)
    : scene_(std::move(scene))
    , names_(std::move(names)) {
    const Visit visit(*scene_);
    places_.reserve(names_.size());
    for (const std::string& name : names_) {
        HPlug plug = plugNamed(name);
        if (!isNumber(plug))
            throw std::invalid_argument(std::string(plug.name().asChar()) + " does not hold one number");
        places_.push_back({plug, isReal(plug)});
    }
}

py::array_t<double> Plugs::get() const {
    py::array_t<double> values(static_cast<py::ssize_t>(places_.size()));
    double* to = values.mutable_data();
    Visit visit(*scene_);
    for (const Place& place : places_) {
        visit.evaluate(place.plug);
        *to++ = quarn::numberOf(place.plug);
    }
    return values;
}

void Plugs::set(const py::array_t<double, py::array::c_style | py::array::forcecast>& values) {
    if (values.ndim() != 1 || static_cast<std::size_t>(values.size()) != places_.size())
        throw std::invalid_argument("values: expected [" + std::to_string(places_.size()) +
                                    "] numbers, got an array of " + std::string(py::str(values.attr("shape"))));
    const double* from = values.data();
    for (std::size_t i = 0; i < places_.size(); ++i)
        if (!std::isfinite(from[i]))
            throw std::invalid_argument(names_[i] + " cannot be set: " + std::to_string(from[i]) +
                                        " is not a finite number");
    const Visit visit(*scene_);
    for (std::size_t i = 0; i < places_.size(); ++i) {
        const Place& place = places_[i];
        if (!place.isReal)
            setValue(*scene_, place.plug, py::float_(from[i]));
        else if (!hasAlready(place.plug, from[i]))
            setReal(place.plug, from[i]);
    }
}

} // namespace python
