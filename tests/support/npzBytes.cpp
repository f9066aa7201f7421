// SPDX-License-Identifier: Apache-2.0
#include "support/npzBytes.h"

#include "storage/byteOrder.h"
#include "storage/npyHeader.h"
#include "storage/zipRecords.h"

#include <zlib.h>

using storage::putLittle;

namespace {

// from the version on, what the headers of both kinds have
void putMember(std::string& bytes, const std::string& name, const std::string& content) {
    const auto size = static_cast<std::uint32_t>(content.size());
    putLittle<std::uint16_t>(bytes, 20);
    bytes.append(2 + 2 + 2 + 2, '\0'); // flags, stored, no time
    putLittle(bytes,
              static_cast<std::uint32_t>(crc32_z(0, reinterpret_cast<const Bytef*>(content.data()), content.size())));
    putLittle(bytes, size);
    putLittle(bytes, size);
    putLittle(bytes, static_cast<std::uint16_t>(name.size()));
    putLittle<std::uint16_t>(bytes, 0); // extra
}

} // namespace

std::string npyBytes(const std::string& descr, const std::vector<std::uint64_t>& shape, const std::string& numbers) {
    return storage::makeNpyHead(descr, shape) + numbers;
}

std::string npzBytes(const std::vector<std::pair<std::string, std::string>>& arrays) {
    std::string bytes, directory;
    for (const auto& [array, content] : arrays) {
        const std::string name = array + ".npy";
        putLittle(directory, storage::zip::centralMark);
        putLittle<std::uint16_t>(directory, 20);
        putMember(directory, name, content);
        directory.append(2 + 2 + 2 + 4, '\0'); // no comment, disk 0, no attributes
        putLittle(directory, static_cast<std::uint32_t>(bytes.size()));
        directory += name;
        putLittle(bytes, storage::zip::localMark);
        putMember(bytes, name, content);
        bytes += name + content;
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
