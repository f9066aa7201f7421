// SPDX-License-Identifier: Apache-2.0
#include "cacheTarget.h"
#include "MemoryFile.h"
#include "require.h"

#include "storage/PointCache.h"

#include <optional>
#include <stdexcept>
#include <vector>

namespace {

std::optional<storage::CacheFormat> formatOf(std::uint8_t letter) {
    switch (letter) {
    case 'p':
        return storage::CacheFormat::pc2;
    case 'm':
        return storage::CacheFormat::mdd;
    case 'z':
        return storage::CacheFormat::npz;
    case 'o':
        return storage::CacheFormat::obj;
    default:
        return std::nullopt;
    }
}

/// What a reader of an accepted file may do; a time that is no number is an error with the file's name.
void readAllOf(const storage::PointCache& cache) {
    if (cache.frameCount() == 0)
        return;
    std::vector<double> xyz(3 * cache.vertexCount());
    for (const std::size_t frame : {std::size_t{0}, cache.frameCount() - 1}) {
        cache.read(frame, 0, xyz);
        try {
            static_cast<void>(cache.secondsOf(frame));
        } catch (const std::runtime_error& error) {
            require(std::string(error.what()).find(cache.path()) != std::string::npos);
        }
    }
}

} // namespace

bool fuzzCache(const std::uint8_t* data, std::size_t size) {
    const auto format = size == 0 ? std::nullopt : formatOf(data[0]);
    if (!format)
        return false;
    const MemoryFile file(data + 1, size - 1);
    std::optional<storage::PointCache> cache;
    try {
        cache.emplace(file.path(), *format);
    } catch (const std::runtime_error& error) {
        require(std::string(error.what()).find(file.path()) != std::string::npos);
        return false;
    }
    readAllOf(*cache);
    return true;
}
