// SPDX-License-Identifier: Apache-2.0
// Ranges of frames, as users write them.
#pragma once

#include <cstddef>
#include <string>

namespace quarn {

struct Warp;

/// Whole frames from `first` to `last`, both included, each `step`-th.
struct FrameRange {
    int first = 1;
    int last = 1;
    int step = 1; ///< above 0

    std::size_t count() const { return static_cast<std::size_t>((last - first) / step) + 1; }
    int frame(std::size_t number) const { return first + static_cast<int>(number) * step; }
};

/// "5", "1-100" or "1-100x5"; frames may be negative ("-10--1"). Throws std::runtime_error, quoting the text, for
/// anything else and where the last frame is before the first.
FrameRange frameRange(const std::string& text);

/// The same as text: "1-100" or "1-100x5".
std::string frameText(const FrameRange& frames);

/// The frames that the text says; with an empty one exportStartFrame to exportEndFrame of the deformer. Throws
/// std::runtime_error when there is neither, or they are in the wrong order.
FrameRange framesToPlay(const std::string& text, const Warp* warp);

} // namespace quarn
