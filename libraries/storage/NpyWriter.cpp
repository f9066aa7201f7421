// SPDX-License-Identifier: Apache-2.0
#include "storage/NpyWriter.h"

#include "storage/finite.h"
#include "storage/npyHeader.h"

#include <stdexcept>

namespace storage {

NpyWriter::NpyWriter(const std::string& path, std::size_t vertexCount)
    : path_(path)
    , file_(path, WholeFile::Writes::anywhere)
    , vertexCount_(vertexCount) {
    // no header yet: what a crash leaves is no array for anybody
    file_.stream() << std::string(npyHeadSize, '\0');
}

void NpyWriter::append(std::span<const float> xyz) {
    if (xyz.size() % 3 != 0 || xyz.size() / 3 != vertexCount_)
        throw std::invalid_argument("point cache '" + path_ + "' has " + std::to_string(vertexCount_) +
                                    " vertices a frame, and is given " + std::to_string(xyz.size()) + " numbers");
    if (const std::optional<std::size_t> place = firstNotFinite(xyz))
        throw std::runtime_error("point cache '" + path_ + "': vertex " + std::to_string(*place / 3) +
                                 " of its frame " + std::to_string(frames_) +
                                 " has a coordinate that is no finite number");
    beginStep();
    file_.write(std::as_bytes(xyz));
    ++frames_;
    isUsable_ = true;
}

void NpyWriter::finish() {
    const std::string head = makeNpyHead(frames_, vertexCount_);
    beginStep();
    file_.rewind();
    file_.stream() << head;
    file_.finish();
}

// usable again when the step has succeeded
void NpyWriter::beginStep() {
    if (!isUsable_)
        throw std::logic_error("point cache '" + path_ + "' is finished, or has failed before");
    isUsable_ = false;
}

} // namespace storage
