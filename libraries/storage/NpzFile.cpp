// SPDX-License-Identifier: Apache-2.0
#include "storage/NpzFile.h"

#include "storage/npyArray.h"
#include "storage/openToRead.h"

#include <algorithm>
#include <optional>
#include <stdexcept>
#include <utility>

#include <zlib.h>

namespace storage {

NpzArray::NpzArray(const ZipMember& member)
    : member_(member) {
    if (member_.isDeflated) {
        if (member_.size / DeflatedStream::mostRatio > member_.bytes.size)
            throw std::runtime_error("it is damaged: " + std::to_string(member_.bytes.size) +
                                     " bytes are to unpack to " + std::to_string(member_.size));
        deflated_.emplace(member_.bytes);
    }
    std::string bytes(std::min<std::uint64_t>(npyPreambleSize, member_.size), '\0');
    read(std::as_writable_bytes(std::span(bytes)));
    const NpyPlace place = findNpyHeader(bytes);
    bytes.resize(place.start + place.length); // at least as long as what is there, and findNpyHeader() knows a limit
    read(std::as_writable_bytes(std::span(bytes)).subspan(static_cast<std::size_t>(place_)));
    head_ = parseNpyArray(std::string_view(bytes).substr(place.start, place.length));
}

void NpzArray::requireSize(std::size_t numberSize) const {
    requireNpySize(head_, numberSize, member_.size - place_);
}

void NpzArray::read(std::span<std::byte> bytes) {
    if (bytes.empty()) // of which zlib's sum would be that of nothing, whatever came before
        return;
    if (bytes.size() > member_.size - place_)
        throw std::runtime_error("it is cut short: one of its arrays ends within its numbers, or before");
    if (deflated_)
        deflated_->read(bytes);
    else
        member_.bytes.read(place_, bytes);
    place_ += bytes.size();
    crc_ = static_cast<std::uint32_t>(crc32_z(crc_, reinterpret_cast<const Bytef*>(bytes.data()), bytes.size()));
}

void NpzArray::finish() {
    if (place_ != member_.size)
        throw std::runtime_error("it is damaged: one of its arrays has more bytes than numbers");
    if (deflated_)
        deflated_->finish();
    if (crc_ != member_.crc)
        throw std::runtime_error("it is damaged: the sum of one of its arrays is another");
}

NpzFile::NpzFile(const std::filesystem::path& path) {
    OpenFile file = openToRead(path, npyArrayFileLimit);
    file_ = std::move(file.descriptor);
    size_ = file.size;
}

bool NpzFile::contains(const std::string& name) const {
    return findMember({file_.number(), 0, size_}, name + ".npy").has_value();
}

NpzArray NpzFile::array(const std::string& name) const {
    const std::optional<ZipMember> member = findMember({file_.number(), 0, size_}, name + ".npy");
    if (!member)
        throw std::runtime_error("it has no array '" + name + "'");
    return NpzArray(*member);
}

} // namespace storage
