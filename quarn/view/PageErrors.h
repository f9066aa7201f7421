// SPDX-License-Identifier: Apache-2.0
// How far the frames of a page are from their target.
#pragma once

#include "quarn/view/PageFrames.h"

#include <cstddef>
#include <vector>

namespace quarn {

/// In millimetres; frames count from 0.
struct PageErrors {
    struct OfFrame {
        double mean = 0.0, largest = 0.0;
    };
    std::vector<OfFrame> frames;
    double mean = 0.0, largest = 0.0;
    std::size_t worstFrame = 0, worstVertex = 0;
    double usual = 0.0; ///< what 99.5 % of all distances do not exceed
};

/// `shape` one of the arrays of points of frames that have a target.
PageErrors pageErrors(const PageFrames& frames, const std::vector<float>& shape, double mmPerUnit);

/// The distance of each vertex in each frame, in mm [frames][vertices].
std::vector<float> distancesToTarget(const PageFrames& frames, const std::vector<float>& shape, double mmPerUnit);

} // namespace quarn
