// SPDX-License-Identifier: Apache-2.0
#include "storage/CacheLayout.h"
#include "storage/byteOrder.h"
#include "storage/pc2Head.h"

#include <cmath>
#include <stdexcept>

namespace storage {
namespace {

constexpr std::string_view magic("POINTCACHE2\0", 12);

std::uint64_t countAt(std::string_view head, std::size_t place, const char* what) {
    const auto count = littleAt<std::int32_t>(head, place);
    if (count < 0)
        throw std::runtime_error(std::string("its number of ") + what + " is " + std::to_string(count));
    return static_cast<std::uint64_t>(count);
}

float finiteAt(std::string_view head, std::size_t place, const char* what) {
    const auto number = littleAt<float>(head, place);
    if (!std::isfinite(number))
        throw std::runtime_error(std::string(what) + " is no finite number");
    return number;
}

} // namespace

std::string makePc2Head(std::uint64_t vertices, std::uint64_t samples, float firstFrame, float frameStep) {
    std::string head(magic);
    putLittle<std::int32_t>(head, 1);
    putLittle(head, static_cast<std::int32_t>(vertices));
    putLittle(head, firstFrame);
    putLittle(head, frameStep);
    putLittle(head, static_cast<std::int32_t>(samples));
    return head;
}

CacheLayout pc2Layout(const FileBytes& file) {
    const std::string head = file.text(0, pc2HeadSize);
    if (!head.starts_with(magic))
        throw std::runtime_error("it is no PC2 file: it does not begin with \"POINTCACHE2\" and a zero");
    if (head.size() < pc2HeadSize)
        throw std::runtime_error("it is cut short: its head takes 32 bytes, and it has " + std::to_string(head.size()));
    if (const auto version = littleAt<std::int32_t>(head, 12); version != 1)
        throw std::runtime_error("its version is " + std::to_string(version) + ": version 1 is read");
    CacheLayout layout;
    layout.vertices = countAt(head, 16, "vertices");
    layout.frames = countAt(head, 28, "samples");
    layout.firstFrame = finiteAt(head, 20, "the frame of its first sample");
    layout.frameStep = finiteAt(head, 24, "its number of frames from one sample to the next");
    layout.points = pointsOf(layout, file, pc2HeadSize);
    return layout;
}

} // namespace storage
