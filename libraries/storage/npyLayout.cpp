// SPDX-License-Identifier: Apache-2.0
#include "storage/CacheLayout.h"
#include "storage/npyHeader.h"

#include <stdexcept>
#include <string>

namespace storage {

// strictly: what another reader might guess is refused (decision 0065)
CacheLayout npyLayout(const FileBytes& file) {
    const NpyPlace place = findNpyHeader(file.text(0, npyPreambleSize));
    const std::uint64_t dataStart = place.start + place.length;
    if (dataStart > file.size)
        throw std::runtime_error("it is cut short: its header is to end at byte " + std::to_string(dataStart) +
                                 ", and it has " + std::to_string(file.size));
    const NpyHeader header = parseNpyHeader(file.text(place.start, place.length));
    CacheLayout layout;
    layout.frames = header.frames;
    layout.vertices = header.vertices;
    layout.scalarSize = header.scalarSize;
    layout.points = pointsOf(layout, file, dataStart);
    return layout;
}

} // namespace storage
