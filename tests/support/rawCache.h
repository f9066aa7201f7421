// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "storage/NpyWriter.h"

#include <filesystem>
#include <fstream>
#include <vector>

/// Writes a point cache of frames of equal length with whatever numbers they hold, also those that our own writer
/// refuses and other programs write.
inline void writeRawCache(const std::filesystem::path& path, const std::vector<std::vector<float>>& frames) {
    constexpr int headerSize = 128;
    storage::NpyWriter writer(path.string(), frames.front().size() / 3);
    for (const std::vector<float>& frame : frames)
        writer.append(std::vector<float>(frame.size()));
    writer.finish();
    std::fstream file(path, std::ios::in | std::ios::out | std::ios::binary);
    file.seekp(headerSize);
    for (const std::vector<float>& frame : frames)
        file.write(reinterpret_cast<const char*>(frame.data()), static_cast<std::streamsize>(4 * frame.size()));
}
