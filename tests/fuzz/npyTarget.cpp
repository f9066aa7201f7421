// SPDX-License-Identifier: Apache-2.0
#include "npyTarget.h"

#include "MemoryFile.h"
#include "require.h"
#include "storage/NpyFile.h"
#include "storage/npyHeader.h"

#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

std::optional<storage::NpyFile> opened(const std::string& path) {
    try {
        return std::optional<storage::NpyFile>(std::in_place, path);
    } catch (const std::runtime_error& error) {
        require(std::string(error.what()).find(path) != std::string::npos);
        return std::nullopt;
    }
}

void requireSameHeader(const storage::NpyFile& file) {
    const std::string head = storage::makeNpyHead(file.frameCount(), file.vertexCount());
    require(head.size() == storage::npyHeadSize);
    const storage::NpyPlace place = storage::findNpyHeader(std::string_view(head).substr(0, storage::npyPreambleSize));
    require(place.start + place.length == head.size());
    const storage::NpyHeader header = storage::parseNpyHeader(std::string_view(head).substr(place.start));
    require(header.frames == file.frameCount() && header.vertices == file.vertexCount());
}

} // namespace

bool fuzzNpy(const std::uint8_t* data, std::size_t size) {
    const MemoryFile memory(data, size);
    const auto file = opened(memory.path());
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
