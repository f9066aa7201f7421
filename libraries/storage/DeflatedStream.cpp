// SPDX-License-Identifier: Apache-2.0
#include "storage/DeflatedStream.h"

#include <algorithm>
#include <array>
#include <limits>
#include <new>
#include <stdexcept>

#include <zlib.h>

namespace storage {

struct DeflatedStream::Stream {
    explicit Stream(const FileBytes& from)
        : packed(from) {
        constexpr int rawDeflate = -15;
        if (inflateInit2(&zlib, rawDeflate) != Z_OK)
            throw std::bad_alloc();
    }
    ~Stream() { inflateEnd(&zlib); }
    Stream(const Stream&) = delete;
    Stream& operator=(const Stream&) = delete;

    /// Unpacks into `room` what there is of it, and returns how much that is: less than all only at the end, or where
    /// more has to be fed.
    std::size_t unpack(std::span<std::byte> room) {
        if (zlib.avail_in == 0)
            feed();
        zlib.next_out = reinterpret_cast<Bytef*>(room.data());
        zlib.avail_out = static_cast<uInt>(std::min<std::size_t>(room.size(), std::numeric_limits<uInt>::max()));
        const uInt before = zlib.avail_out;
        const int answer = inflate(&zlib, Z_NO_FLUSH);
        isAtEnd = answer == Z_STREAM_END;
        if (answer != Z_OK && !isAtEnd)
            fail();
        return before - zlib.avail_out;
    }
    /// Nothing at the end of the packed bytes: the last ones of the stream may be in zlib's hands already.
    void feed() {
        const auto piece = std::span(pieces).first(
            static_cast<std::size_t>(std::min<std::uint64_t>(pieces.size(), packed.size - fed)));
        packed.read(fed, piece);
        fed += piece.size();
        zlib.next_in = reinterpret_cast<Bytef*>(piece.data());
        zlib.avail_in = static_cast<uInt>(piece.size());
    }
    [[noreturn]] static void fail() { throw std::runtime_error("it is damaged: its array cannot be unpacked"); }

    FileBytes packed;
    std::uint64_t fed = 0;
    std::array<std::byte, 1U << 16U> pieces{};
    z_stream zlib = {};
    bool isAtEnd = false;
};

DeflatedStream::DeflatedStream(const FileBytes& packed)
    : stream_(std::make_unique<Stream>(packed)) {}
DeflatedStream::~DeflatedStream() = default;
DeflatedStream::DeflatedStream(DeflatedStream&&) noexcept = default;
DeflatedStream& DeflatedStream::operator=(DeflatedStream&&) noexcept = default;

void DeflatedStream::read(std::span<std::byte> bytes) {
    while (!bytes.empty()) {
        if (stream_->isAtEnd)
            Stream::fail();
        bytes = bytes.subspan(stream_->unpack(bytes));
    }
}

void DeflatedStream::finish() {
    std::byte more{};
    while (!stream_->isAtEnd)
        if (stream_->unpack(std::span(&more, 1)) != 0)
            Stream::fail();
}

} // namespace storage
