// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/PartFrames.h"

#include "quarn/console/UsageError.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <cstdint>

namespace quarn {
namespace {

constexpr int mostPreroll = 1'000'000;

int lastFrame(const FrameRange& range) {
    return range.frame(range.count() - 1); // the last that is said may be between two
}

} // namespace

void addPartOptions(CLI::App& command, PartOptions& options, bool makesParts) {
    if (makesParts)
        command.add_option("--of", options.of, "The frames of the whole, of which --frames is a part")
            ->type_name("A-B[xS]")
            ->needs("--frames");
    command
        .add_option("--preroll", options.preroll,
                    "So many frames are evaluated before the first, and not written: for what remembers them [0]")
        ->type_name("N")
        ->check(CLI::Range(0, mostPreroll));
}

std::optional<int> PartFrames::next() const {
    const int last = lastFrame(frames);
    return isPart && last < lastFrame(whole) ? std::optional(last + whole.step) : std::nullopt;
}

std::vector<int> PartFrames::before(int frame) const {
    const std::int64_t least = isPart ? whole.first : INT32_MIN;
    std::vector<int> found;
    for (std::int64_t back = preroll; back > 0; --back)
        if (const std::int64_t earlier = frame - back * whole.step; earlier >= least)
            found.push_back(static_cast<int>(earlier));
    return found;
}

void PartFrames::addTo(Setup& setup) const {
    setup.add(setupEntry::frames, frameText(whole));
    if (isPart)
        setup.add(setupEntry::part, frameText(frames));
}

bool isRunOf(const FrameRange& frames, const FrameRange& whole) {
    return (frames.step == whole.step || frames.count() == 1) && frames.first >= whole.first &&
           lastFrame(frames) <= lastFrame(whole) && (frames.first - whole.first) % whole.step == 0;
}

PartFrames partFrames(const FrameRange& frames, const PartOptions& options) {
    if (options.of.empty())
        return {frames, frames, false, options.preroll};
    const FrameRange whole = frameRange(options.of);
    if (!isRunOf(frames, whole))
        throw UsageError("--frames " + frameText(frames) + " is no run of the frames of --of " + options.of +
                         ": they have the same step, and begin and end at frames of the whole");
    return {{frames.first, lastFrame(frames), whole.step}, whole, true, options.preroll};
}

} // namespace quarn
