// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "frame/FrameObserver.h"

#include <vector>

/// Keeps what the network gave in the last frame; nothing when it did not run.
class SeenOutputs final : public neuralWarp::FrameObserver {
public:
    void beginFrame() override { values.clear(); }
    void takeOutputs(const std::vector<float>& outputs) override { values = outputs; }

    std::vector<float> values;
};
