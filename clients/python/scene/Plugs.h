// SPDX-License-Identifier: Apache-2.0
// Many numbers of a scene at once, found once: for what is set and read in every frame.
#pragma once

#include "python/scene/OpenScene.h"

#include <pybind11/numpy.h>

#include <memory>
#include <string>
#include <vector>

namespace python {

/// Thread: any that holds the interpreter's lock.
class Plugs {
public:
    /// `names` of plugs that hold a number each. Throws std::invalid_argument, naming the plug.
    Plugs(std::shared_ptr<OpenScene> scene, std::vector<std::string> names);

    const std::vector<std::string>& names() const { return names_; }
    /// float64 [names]: evaluated. Throws std::runtime_error, naming the plug, when one cannot be.
    pybind11::array_t<double> get() const;
    /// Sets those that have another value now, and leaves the others alone. `values` [names]. Throws
    /// std::invalid_argument, and sets nothing, for another number of values and for one that is not finite; naming the
    /// plug, for a plug that cannot be set, when those before it are set.
    void set(const pybind11::array_t<double, pybind11::array::c_style | pybind11::array::forcecast>& values);

private:
    struct Place {
        HPlug plug;
        bool isReal;
    };
    std::shared_ptr<OpenScene> scene_;
    std::vector<std::string> names_;
    std::vector<Place> places_;
};

} // namespace python
