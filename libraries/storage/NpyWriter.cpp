// SPDX-License-Identifier: Apache-2.0
#include "storage/NpyWriter.h"

#include "storage/npyHeader.h"

namespace storage {

NpyWriter::NpyWriter(const std::string& path, std::size_t vertexCount)
    : PointCacheWriter(path, vertexCount, npyHeadSize) {}

PointCacheWriter::Frame NpyWriter::frame() const {
    return {makeNpyHead(frameCount(), vertexCount()), ""};
}

} // namespace storage
