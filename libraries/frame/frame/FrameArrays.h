// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "frame/Points.h"
#include "quill/PaddedPoints.h"
#include "quill/Smoother.h"

#include <cstddef>
#include <memory>

namespace neuralWarp {

/// The arrays in which a frame works, which mean nothing between frames.
struct FrameArrays {
    Points points, deltas, slotDeltas, result;
    quill::PaddedPoints smoothed;
    quill::Smoother::Scratch scratch;

    /// Size in bytes.
    std::size_t bytes() const;
};

/// Lends arrays to a frame for as long as this lives: those that the last frame of any geometry has used, which are
/// still in the cache. There are as many in the process as frames have run at the same time, each as large as its
/// largest frame; a frame that finds them large enough allocates none. On the thread that it was made on.
class LentArrays {
public:
    /// Exchanges what `to` holds for the arrays that are lent. `to` must live longer. Throws std::bad_alloc.
    explicit LentArrays(FrameArrays& to);
    ~LentArrays();
    LentArrays(const LentArrays&) = delete;
    LentArrays& operator=(const LentArrays&) = delete;

private:
    FrameArrays& to_;
    std::unique_ptr<FrameArrays> lent_; // what `to_` held
};

} // namespace neuralWarp
