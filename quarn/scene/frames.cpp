// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/frames.h"

#include "quarn/console/UsageError.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/plugs.h"

#include <charconv>
#include <optional>
#include <stdexcept>
#include <string_view>

namespace quarn {
namespace {

constexpr int largestFrame = 100'000'000; // differences of two frames stay within int

// takes a whole number from the front of the text
std::optional<int> takeNumber(std::string_view& text) {
    int value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc() || value > largestFrame || value < -largestFrame)
        return {};
    text.remove_prefix(static_cast<std::size_t>(end - text.data()));
    return value;
}

std::optional<int> takeNumberAfter(char sign, std::string_view& text) {
    if (text.empty() || text.front() != sign)
        return {};
    text.remove_prefix(1);
    return takeNumber(text);
}

} // namespace

FrameRange frameRange(const std::string& text) {
    std::string_view rest = text;
    const std::optional<int> first = takeNumber(rest);
    const std::optional<int> last = rest.empty() ? first : takeNumberAfter('-', rest);
    const std::optional<int> step = rest.empty() ? 1 : takeNumberAfter('x', rest);
    if (!first || !last || !step || !rest.empty())
        throw UsageError("\"" + text + "\" is no range of frames: write 5, 1-100 or 1-100x5");
    if (*last < *first || *step < 1)
        throw UsageError("\"" + text +
                         "\" is no range of frames: the last is not before the first, and steps are at least 1");
    return {*first, *last, *step};
}

std::string frameText(const FrameRange& frames) {
    const std::string text = std::to_string(frames.first) + "-" + std::to_string(frames.last);
    return frames.step == 1 ? text : text + "x" + std::to_string(frames.step);
}

FrameRange framesToPlay(const std::string& text, const Warp* warp) {
    if (!text.empty())
        return frameRange(text);
    if (warp == nullptr)
        throw std::runtime_error(
            "the scene has no neuralWarp deformer that says which frames: give --frames, as 1-100");
    return frameRange(std::to_string(wholeNumberOf(warp->plug("exportStartFrame"))) + "-" +
                      std::to_string(wholeNumberOf(warp->plug("exportEndFrame"))));
}

} // namespace quarn
