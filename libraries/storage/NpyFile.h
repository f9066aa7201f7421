// SPDX-License-Identifier: Apache-2.0
// Point caches in a NumPy array file. What numpy.save writes is read.
#pragma once

#include "storage/PointCache.h"

namespace storage {

/// An array of [frames, vertices, 3] or [vertices, 3] numbers, '<f4' or '<f8' in C order, whatever its name.
class NpyFile : public PointCache {
public:
    explicit NpyFile(const std::string& path)
        : PointCache(path, CacheFormat::npy) {}
};

} // namespace storage
