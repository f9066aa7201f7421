// SPDX-License-Identifier: Apache-2.0
#include "support/npzBytes.h"

#include "storage/byteOrder.h"
#include "storage/npyHeader.h"
#include "storage/zipRecords.h"

#include <zlib.h>

using storage::putLittle;

namespace {

std::string deflated(const std::string& content) {
    constexpr int rawDeflate = -15, memory = 8;
    z_stream stream{};
    deflateInit2(&stream, Z_DEFAULT_COMPRESSION, Z_DEFLATED, rawDeflate, memory, Z_DEFAULT_STRATEGY);
    std::string packed(deflateBound(&stream, static_cast<uLong>(content.size())), '\0');
    std::string from = content; // what zlib takes is not const
    stream.next_in = reinterpret_cast<Bytef*>(from.data());
    stream.avail_in = static_cast<uInt>(from.size());
    stream.next_out = reinterpret_cast<Bytef*>(packed.data());
    stream.avail_out = static_cast<uInt>(packed.size());
    deflate(&stream, Z_FINISH);
    packed.resize(stream.total_out);
    deflateEnd(&stream);
    return packed;
}

/// What is in the archive for `content`.
struct Member {
    std::string name, content, packed;
    bool isDeflated;
};

// from the version on, what the headers of both kinds have
void putMember(std::string& bytes, const Member& member) {
    putLittle<std::uint16_t>(bytes, 20);
    putLittle<std::uint16_t>(bytes, 0); // flags
    putLittle<std::uint16_t>(bytes, member.isDeflated ? 8 : 0);
    bytes.append(2 + 2, '\0'); // no time
    putLittle(bytes, static_cast<std::uint32_t>(
                         crc32_z(0, reinterpret_cast<const Bytef*>(member.content.data()), member.content.size())));
    putLittle(bytes, static_cast<std::uint32_t>(member.packed.size()));
    putLittle(bytes, static_cast<std::uint32_t>(member.content.size()));
    putLittle(bytes, static_cast<std::uint16_t>(member.name.size()));
    putLittle<std::uint16_t>(bytes, 0); // extra
}

} // namespace

std::string npyBytes(const std::string& descr, const std::vector<std::uint64_t>& shape, const std::string& numbers) {
    return storage::makeNpyHead(descr, shape) + numbers;
}

std::string npzBytes(const std::vector<std::pair<std::string, std::string>>& arrays, bool isDeflated) {
    std::string bytes, directory;
    for (const auto& [array, content] : arrays) {
        const Member member{array + ".npy", content, isDeflated ? deflated(content) : content, isDeflated};
        putLittle(directory, storage::zip::centralMark);
        putLittle<std::uint16_t>(directory, 20);
        putMember(directory, member);
        directory.append(2 + 2 + 2 + 4, '\0'); // no comment, disk 0, no attributes
        putLittle(directory, static_cast<std::uint32_t>(bytes.size()));
        directory += member.name;
        putLittle(bytes, storage::zip::localMark);
        putMember(bytes, member);
        bytes += member.name + member.packed;
    }
    const auto start = static_cast<std::uint32_t>(bytes.size());
    bytes += directory;
    putLittle(bytes, storage::zip::endMark);
    bytes.append(2 + 2, '\0');
    putLittle(bytes, static_cast<std::uint16_t>(arrays.size()));
    putLittle(bytes, static_cast<std::uint16_t>(arrays.size()));
    putLittle(bytes, static_cast<std::uint32_t>(directory.size()));
    putLittle(bytes, start);
    bytes.append(2, '\0'); // no comment
    return bytes;
}

std::string shapesArchive(const std::string& digits, const std::vector<float>& values, std::uint64_t shapes) {
    const std::string numbers(reinterpret_cast<const char*>(values.data()), values.size() * sizeof(float));
    return npzBytes({{"json_xxh3_128", npyBytes("|S32", {}, digits)},
                     {"shapes", npyBytes("<f4", {values.size() / 3 / shapes, shapes, 3}, numbers)}});
}
