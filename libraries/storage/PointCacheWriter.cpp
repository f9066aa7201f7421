// SPDX-License-Identifier: Apache-2.0
#include "storage/PointCacheWriter.h"

#include "storage/finite.h"

#include <algorithm>
#include <optional>
#include <stdexcept>

namespace storage {

PointCacheWriter::PointCacheWriter(const std::string& path, std::size_t vertexCount, std::size_t headSize)
    : path_(path)
    , file_(path, WholeFile::Writes::anywhere)
    , vertexCount_(vertexCount) {
    // no head yet: what a crash leaves is no cache for anybody
    const std::string zeros(1U << 12U, '\0');
    for (std::size_t left = headSize; left > 0; left -= std::min(left, zeros.size()))
        file_.stream().write(zeros.data(), static_cast<std::streamsize>(std::min(left, zeros.size())));
}

PointCacheWriter::~PointCacheWriter() = default;

void PointCacheWriter::append(std::span<const float> xyz) {
    if (xyz.size() % 3 != 0 || xyz.size() / 3 != vertexCount_)
        throw std::invalid_argument("point cache '" + path_ + "' has " + std::to_string(vertexCount_) +
                                    " vertices a frame, and is given " + std::to_string(xyz.size()) + " numbers");
    if (const std::optional<std::size_t> place = firstNotFinite(xyz))
        throw std::runtime_error("point cache '" + path_ + "': vertex " + std::to_string(*place / 3) +
                                 " of its frame " + std::to_string(frames_) +
                                 " has a coordinate that is no finite number");
    beginStep();
    writePoints(file_, xyz);
    ++frames_;
    isUsable_ = true;
}

void PointCacheWriter::writePoints(WholeFile& file, std::span<const float> xyz) {
    file.write(std::as_bytes(xyz));
}

void PointCacheWriter::finish() {
    beginStep();
    const Frame around = frame();
    file_.stream() << around.behind;
    file_.rewind();
    file_.stream() << around.before;
    file_.finish();
}

// usable again when the step has succeeded
void PointCacheWriter::beginStep() {
    if (!isUsable_)
        throw std::logic_error("point cache '" + path_ + "' is finished, or has failed before");
    isUsable_ = false;
}

} // namespace storage
