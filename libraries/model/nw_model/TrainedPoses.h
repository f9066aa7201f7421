// SPDX-License-Identifier: Apache-2.0
// neuralWarp model runtime: "trained_poses.npy" of a model directory, representatives of what it was trained on.
#pragma once

#include "nw_model/ModelCertificate.h"

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <span>
#include <vector>

namespace neuralWarp {

/// Most poses that are read, and most bytes of the file.
inline constexpr std::size_t trainedPosesLimit = 1000;
inline constexpr std::uint64_t trainedPosesFileLimit = std::uint64_t{64} << 20;

/// Rows of controls that stand for all rows of a training, and how far others are from the nearest of them. Immutable,
/// so one object may be used by several threads at once.
class TrainedPoses {
public:
    /// None.
    TrainedPoses() = default;
    /// `values` [poses][ranges.count()], in the controls' units.
    TrainedPoses(const ControlRanges& ranges, std::vector<float> values);

    /// Reads the file, an array [poses, controls] of '<f4', that the certificate names by its sum. None where the
    /// certificate names none. Throws std::runtime_error, with a sentence, when it is missing, another one, too large,
    /// of another shape, or holds a number that is not finite. Thread: any.
    static TrainedPoses read(const std::filesystem::path& directory, const ModelCertificate& certificate);

    bool isEmpty() const { return values_.empty(); }
    std::size_t count() const { return units_.empty() ? 0 : values_.size() / units_.size(); }

    /// To the nearest pose: the root mean square over the controls of their differences, each in ControlRanges::unit().
    /// 0 on a pose. Infinite for a value that is not finite. Not for none.
    /// `controls` as many as the ranges have, at least.
    double distance(std::span<const float> controls) const;

private:
    std::vector<double> units_;
    std::vector<float> values_; ///< [poses][controls]
};

} // namespace neuralWarp
