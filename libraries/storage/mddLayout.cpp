// SPDX-License-Identifier: Apache-2.0
#include "storage/CacheLayout.h"
#include "storage/byteOrder.h"
#include "storage/mddHead.h"

#include <stdexcept>

namespace storage {
namespace {

// the format has no mark of its own: numbers that make no sense are what tells another file
std::uint64_t countAt(std::string_view head, std::size_t place, const char* what) {
    const auto count = bigAt<std::int32_t>(head, place);
    if (count < 0)
        throw std::runtime_error(std::string("it is no MDD file: its number of ") + what + " is " +
                                 std::to_string(count));
    return static_cast<std::uint64_t>(count);
}

} // namespace

std::string makeMddHead(std::uint64_t vertices, std::span<const float> seconds) {
    std::string head;
    putBig(head, static_cast<std::int32_t>(seconds.size()));
    putBig(head, static_cast<std::int32_t>(vertices));
    for (const float time : seconds)
        putBig(head, time);
    return head;
}

CacheLayout mddLayout(const FileBytes& file) {
    const std::string counts = file.text(0, mddCountsSize);
    if (counts.size() < mddCountsSize)
        throw std::runtime_error("it is cut short: its head takes 8 bytes and more, and it has " +
                                 std::to_string(counts.size()));
    CacheLayout layout;
    layout.frames = countAt(counts, 0, "frames");
    layout.vertices = countAt(counts, 4, "vertices");
    layout.isBigEndian = true;
    const std::uint64_t timesSize = 4 * layout.frames;
    layout.points = pointsOf(layout, file, mddCountsSize + timesSize);
    if (timesSize > file.size - mddCountsSize) // where there are no vertices
        throw std::runtime_error("it is cut short: it has no times for its " + std::to_string(layout.frames) +
                                 " frames");
    layout.times = file.part(mddCountsSize, timesSize);
    return layout;
}

} // namespace storage
