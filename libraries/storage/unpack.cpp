// SPDX-License-Identifier: Apache-2.0
#include "storage/unpack.h"

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

constexpr const char* damaged = "it is damaged: its array cannot be unpacked";

/// The bytes of a member, piece by piece.
class Unpacking {
public:
    explicit Unpacking(const FileBytes& packed)
        : packed_(packed) {
        constexpr int rawDeflate = -15;
        if (inflateInit2(&stream_, rawDeflate) != Z_OK)
            throw std::bad_alloc();
    }
    ~Unpacking() { inflateEnd(&stream_); }
    Unpacking(const Unpacking&) = delete;
    Unpacking& operator=(const Unpacking&) = delete;

    bool isAtEnd() const { return isAtEnd_; }
    /// Valid until the next call.
    std::span<const std::byte> next() {
        if (stream_.avail_in == 0)
            feed();
        stream_.next_out = reinterpret_cast<Bytef*>(unpackedPiece_.data());
        stream_.avail_out = static_cast<uInt>(unpackedPiece_.size());
        const int answer = inflate(&stream_, Z_NO_FLUSH);
        isAtEnd_ = answer == Z_STREAM_END;
        if (answer != Z_OK && !isAtEnd_)
            throw std::runtime_error(damaged);
        return std::span(unpackedPiece_).first(unpackedPiece_.size() - stream_.avail_out);
    }

private:
    void feed() {
        const auto piece =
            std::span(packedPiece_)
                .first(static_cast<std::size_t>(std::min<std::uint64_t>(packedPiece_.size(), packed_.size - read_)));
        if (piece.empty())
            throw std::runtime_error(damaged);
        packed_.read(read_, piece);
        read_ += piece.size();
        stream_.next_in = reinterpret_cast<Bytef*>(piece.data());
        stream_.avail_in = static_cast<uInt>(piece.size());
    }

    FileBytes packed_;
    std::uint64_t read_ = 0;
    std::array<std::byte, 1U << 16U> packedPiece_{}, unpackedPiece_{};
    z_stream stream_ = {};
    bool isAtEnd_ = false;
};

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
    Unpacking unpacking(member.bytes);
    std::uint64_t written = 0;
    uLong sum = crc32(0, nullptr, 0);
    while (!unpacking.isAtEnd() && written <= member.size) {
        const std::span<const std::byte> piece = unpacking.next();
        put(file, piece);
        sum = crc32(sum, reinterpret_cast<const Bytef*>(piece.data()), static_cast<uInt>(piece.size()));
        written += piece.size();
    }
    if (written != member.size || sum != member.crc)
        throw std::runtime_error(damaged);
    return file;
}

} // namespace storage
