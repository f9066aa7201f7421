// SPDX-License-Identifier: Apache-2.0
// Which frames a command makes: all that there are to be, or a part of them while others make the rest.
#pragma once

#include "quarn/scene/Setup.h"
#include "quarn/scene/frames.h"

#include <optional>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace quarn {

/// What --of and --preroll say.
struct PartOptions {
    std::string of;  ///< the frames of the whole, as frameRange() reads them; empty: what is made is the whole
    int preroll = 0; ///< so many frames are evaluated before the first, and not written
};

/// Adds --preroll, and --of where the command makes parts. `options` must outlive `command`.
void addPartOptions(CLI::App& command, PartOptions& options, bool makesParts);

struct PartFrames {
    FrameRange frames; ///< that are made
    FrameRange whole;  ///< of which they are a run; `frames` themselves where nothing was said of a whole
    bool isPart = false;
    int preroll = 0;

    /// The frame of the whole that follows the last of these; none at its end, and where this is no part.
    std::optional<int> next() const;
    /// The frames to evaluate, in this order, before `frame`, when nothing of what comes before it was: `preroll` of
    /// them, at the step of `frames`. None of them is before the first frame of a whole that was named.
    std::vector<int> before(int frame) const;
    /// Adds "frames", those of the whole, and for a part "part".
    void addTo(Setup& setup) const;
};

/// Whether `frames` follow each other in `whole`. A single frame has no step.
bool isRunOf(const FrameRange& frames, const FrameRange& whole);

/// Throws UsageError, naming both ranges, when `frames` is no run of frames of options.of.
PartFrames partFrames(const FrameRange& frames, const PartOptions& options);

} // namespace quarn
