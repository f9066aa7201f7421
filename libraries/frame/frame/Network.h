// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <span>
#include <vector>

namespace neuralWarp {

/// A trained network, whatever runs it.
class Network {
public:
    virtual ~Network() = default;

    /// The outputs for some control values, in their order: three for each slot, or one for each principal shape. Empty
    /// when there are none to give; who made the network knows why.
    ///   controls  at least as many as the network takes; not kept
    /// One thread at a time.
    virtual std::vector<float> run(std::span<const float> controls) = 0;
};

} // namespace neuralWarp
