// SPDX-License-Identifier: Apache-2.0
#include "storage/unpack.h"

#include "storage/DeflatedStream.h"
#include "storage/FileError.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <span>
#include <stdexcept>
#include <string>

#include <fcntl.h>
#include <unistd.h>
#include <zlib.h>

namespace storage {
namespace {

void put(const Descriptor& file, std::span<const std::byte> bytes) {
    if (const int error = writeAll(file.number(), bytes))
        throw std::runtime_error("its array cannot be unpacked into a temporary file: " + textOfErrno(error));
}

} // namespace

Descriptor unnamedFile() {
    std::string name = (std::filesystem::temp_directory_path() / "pointCacheXXXXXX").string();
    Descriptor file(::mkostemp(name.data(), O_CLOEXEC));
    if (!file.isOpen() || ::unlink(name.c_str()) != 0)
        throw std::runtime_error("it cannot be unpacked to " + name + ": " + textOfErrno(errno));
    return file;
}

Descriptor unpack(const ZipMember& member) {
    if (member.size > unpackedLimit)
        throw std::runtime_error("its array takes " + std::to_string(member.size) + " bytes unpacked: at most " +
                                 std::to_string(unpackedLimit) + " are; numpy.savez and numpy.save pack nothing");
    Descriptor file = unnamedFile();
    DeflatedStream unpacking(member.bytes);
    std::array<std::byte, 1U << 16U> pieces; // filled before it is read
    uLong sum = crc32(0, nullptr, 0);
    for (std::uint64_t left = member.size; left != 0;) {
        const auto piece =
            std::span(pieces).first(static_cast<std::size_t>(std::min<std::uint64_t>(pieces.size(), left)));
        unpacking.read(piece);
        put(file, piece);
        sum = crc32(sum, reinterpret_cast<const Bytef*>(piece.data()), static_cast<uInt>(piece.size()));
        left -= piece.size();
    }
    unpacking.finish();
    if (sum != member.crc)
        throw std::runtime_error("it is damaged: its array cannot be unpacked");
    return file;
}

} // namespace storage
