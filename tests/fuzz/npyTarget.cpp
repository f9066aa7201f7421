// SPDX-License-Identifier: Apache-2.0
#include "npyTarget.h"

#include "rig/NpyFile.h"

#include <cstdlib>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include <sys/mman.h>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

std::optional<rig::NpyFile> opened(const std::string& path) {
    try {
        return std::optional<rig::NpyFile>(std::in_place, path);
    } catch (const std::runtime_error& error) {
        require(std::string(error.what()).find(path) != std::string::npos);
        return std::nullopt;
    }
}

void requireSameHeader(const rig::NpyFile& file) {
    const std::string head = rig::makeNpyHead(file.frameCount(), file.vertexCount());
    require(head.size() == rig::npyHeadSize);
    const rig::NpyPlace place = rig::findNpyHeader(std::string_view(head).substr(0, rig::npyPreambleSize));
    require(place.start + place.length == head.size());
    const rig::NpyHeader header = rig::parseNpyHeader(std::string_view(head).substr(place.start));
    require(header.frames == file.frameCount() && header.vertices == file.vertexCount());
}

} // namespace

bool fuzzNpy(const std::uint8_t* data, std::size_t size) {
    const storage::Descriptor memory(memfd_create("fuzz", MFD_CLOEXEC));
    require(memory.isOpen());
    require(write(memory.number(), data, size) == static_cast<ssize_t>(size));
    const auto file = opened("/proc/self/fd/" + std::to_string(memory.number()));
    if (!file)
        return false;
    requireSameHeader(*file);
    if (file->frameCount() == 0)
        return true;
    std::vector<double> xyz(3 * file->vertexCount());
    for (const std::size_t frame : {std::size_t{0}, file->frameCount() - 1})
        file->read(frame, 0, xyz);
    return true;
}
