// SPDX-License-Identifier: Apache-2.0
// neuralWarp model runtime: what a model says of itself, "certificate" in "metadata.json" of a model directory.
#pragma once

#include "nw_model/ControlRanges.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace neuralWarp {

/// Distances of vertices from where they should be, over vertices and frames, in mm.
struct ErrorFigures {
    double mean = 0.0, p99 = 0.0, p9999 = 0.0, max = 0.0; ///< p9999: the 99.99th percentile
};

/// Errors over one set of frames that the model was not trained on.
struct CertifiedErrors {
    std::uint64_t frames = 0;
    std::string heldOut; ///< how they were held out: words for a person, UTF-8
    std::string poses;   ///< where they come from: "drawn", "motion" or "unknown"
    ErrorFigures network;
    std::optional<ErrorFigures> skin, zeroDeltas, basis; ///< without a model; with deltas of 0; the best of its shapes
};

/// The mean error over a frame's vertices that is to be expected at a distance from the trained poses, as frames that
/// were held out have shown it. It never falls with the distance.
class ExpectedError {
public:
    /// Of nothing: empty.
    ExpectedError() = default;
    /// Both [knots]: distances of TrainedPoses, rising, and errors in mm, not falling; all finite and not negative.
    /// Throws std::invalid_argument that says what is wrong.
    ExpectedError(std::vector<double> distances, std::vector<double> millimetres);

    bool isEmpty() const { return distances_.empty(); }
    /// In mm, for a distance of TrainedPoses: linear between two knots, and the first and the last one's before and
    /// behind them. `outside`, a ControlRanges::distance(), multiplies it by (1 + outside)^3: nothing was measured
    /// there, and the power is that of the demo's hand (decision 0193). Not for an empty one.
    double at(double distance, double outside) const;
    /// The distance of the last knot. Not for an empty one.
    double measuredTo() const { return distances_.back(); }

    const std::vector<double>& distances() const { return distances_; }
    const std::vector<double>& millimetres() const { return millimetres_; }

private:
    std::vector<double> distances_, millimetres_;
};

/// A plain value.
struct ModelCertificate {
    std::vector<std::string> controlNames; ///< as many as ranges.count(), UTF-8
    ControlRanges ranges;
    std::uint64_t trainingFrames = 0;
    std::vector<CertifiedErrors> errors;
    ExpectedError expected;      ///< empty where too few frames were held out, or there is no file of trained poses
    std::string mesh, dataSet;   ///< digests, "sha256:" or "xxh3_128:" and hexadecimal digits; empty where unknown
    std::string trainedPosesSum; ///< XXH3-128 of "trained_poses.npy", hexadecimal; empty where there is none
};

/// Reads the certificate of "metadata.json". `path` is the file's.
///
/// Returns none when the file has none: it was written by an older trainer, or by another. Throws std::runtime_error
/// with a sentence that names the member and the value for one that is not to be relied on: a value of another kind,
/// lists of unequal lengths, a number that is not finite or below 0 where none can be; and for a file that cannot be
/// read. Members that are not known are passed over.
///
/// Thread: any; no shared state.
std::optional<ModelCertificate> readCertificate(const std::filesystem::path& path);

} // namespace neuralWarp
