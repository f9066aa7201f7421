// SPDX-License-Identifier: Apache-2.0
// The sliders of an open scene that sampling sets, and how far.
#pragma once

#include "quarn/console/json.h"

#include <string>
#include <vector>

namespace quarn {

struct SliderReport {
    std::string name; ///< as everybody calls it: "head_sliders.jawOpen"
    double least = 0.0, most = 0.0, rest = 0.0;
};

/// Those that the poseGenerator of a deformer is made of, in its order. Throws std::runtime_error, naming the plug.
/// Thread: main.
std::vector<SliderReport> describeSliders();

/// A line a slider below one that counts them; nothing without sliders.
std::string slidersText(const std::vector<SliderReport>& sliders);
/// As a member "sliders" of the object that is open.
void writeSliders(JsonWriter& json, const std::vector<SliderReport>& sliders);

} // namespace quarn
