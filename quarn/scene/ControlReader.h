// SPDX-License-Identifier: Apache-2.0
// The control values of a deformer, frame by frame.
#pragma once

#include "quarn/scene/Warp.h"

#include <cstddef>
#include <string>
#include <vector>

namespace quarn {

/// Reads what a model would get as its inputs, at the scene's present time. Errors are std::runtime_error that names
/// the value. `warp` must outlive it. Thread: main.
class ControlReader {
public:
    explicit ControlReader(const Warp& warp)
        : warp_(warp) {}

    /// Evaluates the values. Throws for one that is no finite number in single precision, and, once there are names,
    /// for another number of values.
    void read();
    /// Finds out what the values are, after read(). Throws when there are none.
    void readNames();
    const std::vector<std::string>& names() const { return names_; } ///< empty before readNames()
    const std::vector<float>& values() const { return values_; }     ///< as many as names()

private:
    void takeElements(std::vector<unsigned> indices);
    [[noreturn]] void refuse(std::size_t place) const;

    const Warp& warp_;
    HPlug array_;                   ///< controlValues
    std::vector<unsigned> indices_; ///< of its elements
    std::vector<HPlug> plugs_;      ///< these
    std::vector<std::string> names_;
    std::vector<float> values_;
};

} // namespace quarn
