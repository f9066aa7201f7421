// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/exportFrames.h"

#include "quarn/scene/plugs.h"

#include <stdexcept>

namespace quarn {

FrameRange exportFrames(const Warp& warp, const std::string& text) {
    if (!text.empty())
        return frameRange(text);
    const int first = wholeNumberOf(warp.plug("exportStartFrame"));
    const int last = wholeNumberOf(warp.plug("exportEndFrame"));
    if (last < first)
        throw std::runtime_error(warp.name + ".exportStartFrame is " + std::to_string(first) +
                                 ", after exportEndFrame " + std::to_string(last) + "; set them, or give --frames");
    return {first, last, 1};
}

} // namespace quarn
