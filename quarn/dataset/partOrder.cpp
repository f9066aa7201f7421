// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/partOrder.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {
namespace {

std::string named(const PlacedPart& part) {
    return part.path.string() + " (" + frameText(part.record.frames) + ")";
}

int lastFrame(const FrameRange& range) {
    return range.frame(range.count() - 1);
}

void requireOneWhole(const PlacedPart& first, const PlacedPart& part) {
    const std::string one = frameText(first.record.of), other = frameText(part.record.of);
    if (one != other)
        throw std::runtime_error(first.path.string() + " is a part of " + one + ", and " + part.path.string() +
                                 " one of " + other);
    if (!isRunOf(part.record.frames, part.record.of))
        throw std::runtime_error(named(part) + " has frames that are no run of those of the whole, " + other);
}

[[noreturn]] void refuseGap(int first, int last, const FrameRange& whole) {
    throw std::runtime_error(
        (first == last ? "frame " + std::to_string(first) + " of " + frameText(whole) + " is"
                       : "frames " + frameText({first, last, whole.step}) + " of " + frameText(whole) + " are") +
        " in none of the parts");
}

} // namespace

void orderParts(std::vector<PlacedPart>& parts) {
    for (const PlacedPart& part : parts)
        requireOneWhole(parts.front(), part);
    std::stable_sort(parts.begin(), parts.end(), [](const PlacedPart& a, const PlacedPart& b) {
        return a.record.frames.first < b.record.frames.first;
    });
    const FrameRange& whole = parts.front().record.of;
    int next = whole.first;
    for (std::size_t i = 0; i < parts.size(); ++i) {
        const int first = parts[i].record.frames.first;
        if (first < next)
            throw std::runtime_error("frame " + std::to_string(first) + " is in two parts: " + named(parts[i - 1]) +
                                     " and " + named(parts[i]));
        if (first > next)
            refuseGap(next, first - whole.step, whole);
        next = lastFrame(parts[i].record.frames) + whole.step;
    }
    if (next <= lastFrame(whole))
        refuseGap(next, lastFrame(whole), whole);
}

void requireOneBuild(const std::vector<PlacedPart>& parts) {
    const auto require = [&](const char* what, auto of) {
        for (const PlacedPart& part : parts)
            if (of(part) != of(parts.front()))
                throw std::runtime_error(parts.front().path.string() + " was made by " + what + " " +
                                         of(parts.front()) + ", and " + part.path.string() + " by " + of(part) +
                                         ": their rows need not go together; make one of them again");
    };
    require("quarn", [](const PlacedPart& part) { return part.record.quarn; });
    require("build", [](const PlacedPart& part) { return part.record.build; });
}

void requireSeams(const std::vector<PlacedPart>& parts) {
    for (std::size_t i = 1; i < parts.size(); ++i) {
        const PlacedPart &before = parts[i - 1], &part = parts[i];
        if (before.record.nextSum == part.record.firstSum)
            continue;
        const std::string one = before.record.instructionSet, other = part.record.instructionSet;
        throw std::runtime_error(
            "the seam between " + named(before) + " and " + named(part) + ", at frame " +
            std::to_string(part.record.frames.first) + ": the two have computed different rows for it. " +
            (one == other ? "Where something in the scene remembers the frames before, parts need --preroll N, with N "
                            "as many frames as it remembers"
                          : "They were made with " + one + " and " + other +
                                ", which may differ in last digits; make all parts on processors of one kind. If they "
                                "differ then as well, parts need --preroll N"));
    }
}

void refuseSetup(const std::filesystem::path& first, const std::filesystem::path& second,
                 const Setup::Difference& difference) {
    throw std::runtime_error(first.string() + " and " + second.string() +
                             " were made from different things: " + difference.thing + " is " + difference.before +
                             " in the first, and " + difference.now + " in the second");
}

} // namespace quarn
