// SPDX-License-Identifier: Apache-2.0
// Frames whose poses a model was not trained on, and the error that is to be expected of each.
#pragma once

#include "nw_model/ModelCertificate.h"
#include "nw_model/TrainedPoses.h"

#include <cstddef>
#include <map>
#include <optional>
#include <span>
#include <string>
#include <vector>

namespace quarn {

/// A control that left the range of the training.
struct OutsideControl {
    std::string name;
    std::size_t frames = 0;     ///< in which it did
    double excess = 0.0;        ///< the furthest, in its units: below the minimum it is negative
    std::optional<double> part; ///< the same in widths of its range; none where it never moved in the training
    int frame = 0;              ///< where it is furthest
};

struct FrameError {
    int frame = 0;
    double millimetres = 0.0; ///< mean over the vertices
};

struct ExpectedErrors {
    double mean = 0.0;             ///< over the frames, in mm
    std::size_t beyond = 0;        ///< frames outside, or further from the trained poses than any that was measured
    std::vector<FrameError> worst; ///< at most five, the worst first
};

struct PoseCounts {
    std::size_t frames = 0;
    std::size_t outside = 0;                ///< frames with a control that is
    double distance = 0.0;                  ///< the largest ControlRanges::distance()
    std::vector<OutsideControl> controls;   ///< those that are furthest out in units of their ranges first
    std::optional<ExpectedErrors> expected; ///< none without trained poses, or a curve of errors
};

/// Is shown frame after frame. Thread: one at a time.
class PoseCounter {
public:
    PoseCounter(neuralWarp::ModelCertificate certificate, neuralWarp::TrainedPoses poses);

    /// `controls` what the deformer's network gets. A frame with fewer of them than the model takes does not count.
    void add(int frame, std::span<const float> controls);
    PoseCounts counts() const;

private:
    void look(int frame, std::span<const float> controls);

    neuralWarp::ModelCertificate certificate_;
    neuralWarp::TrainedPoses poses_;
    PoseCounts counts_; ///< without what counts() makes of the two below
    std::map<std::size_t, OutsideControl> outside_;
    std::vector<FrameError> errors_;
    std::size_t beyond_ = 0;
};

} // namespace quarn
