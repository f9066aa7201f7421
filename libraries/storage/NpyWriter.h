// SPDX-License-Identifier: Apache-2.0
// Point caches, written: what numpy.load reads.
#pragma once

#include "storage/PointCacheWriter.h"

namespace storage {

/// Writes an array of [frames, vertices, 3] '<f4', whatever the name of the file. As many frames as are appended.
class NpyWriter final : public PointCacheWriter {
public:
    NpyWriter(const std::string& path, std::size_t vertexCount);

private:
    Frame frame() const override;
};

} // namespace storage
