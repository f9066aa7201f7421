// SPDX-License-Identifier: Apache-2.0
#include "storage/NpyFile.h"

#include "storage/FileError.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cerrno>
#include <stdexcept>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace storage {
namespace {

static_assert(std::endian::native == std::endian::little, "numbers are read as they lie in the file");

FileIdentity identityFrom(const struct stat& status) {
    FileIdentity identity;
    identity.device = status.st_dev;
    identity.inode = status.st_ino;
    identity.size = static_cast<std::uint64_t>(status.st_size);
    identity.seconds = status.st_mtim.tv_sec;
    identity.nanoseconds = status.st_mtim.tv_nsec;
    return identity;
}

} // namespace

std::optional<FileIdentity> identityOf(const std::string& path) {
    struct stat status = {};
    if (stat(path.c_str(), &status) != 0)
        return std::nullopt;
    return identityFrom(status);
}

// a pipe would wait for somebody who writes into it: O_NONBLOCK opens it at once, and then it is refused
NpyFile::NpyFile(const std::string& path)
    : path_(path)
    , file_(::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC)) {
    struct stat status = {};
    if (!file_.isOpen() || fstat(file_.number(), &status) != 0)
        fail(textOfErrno(errno));
    if (!S_ISREG(status.st_mode))
        fail("it is no regular file");
    identity_ = identityFrom(status);
    readHeader();
    checkSize();
}

/// What `parse` returns; the reason it throws gets the path.
template <class Parse>
auto NpyFile::parsed(Parse parse) const {
    try {
        return parse();
    } catch (const std::runtime_error& error) {
        fail(error.what());
    }
}

// strictly: what another reader might guess is refused (decision 0065)
void NpyFile::readHeader() {
    std::array<char, npyPreambleSize> first = {};
    const std::size_t size = std::min<std::uint64_t>(first.size(), identity_.size);
    readBytes(0, std::as_writable_bytes(std::span(first).first(size)));
    const NpyPlace place = parsed([&] { return findNpyHeader({first.data(), size}); });
    const std::uint64_t dataStart = place.start + place.length;
    if (dataStart > identity_.size)
        fail("it is cut short: its header is to end at byte " + std::to_string(dataStart) + ", and it has " +
             std::to_string(identity_.size));
    std::string text(place.length, '\0');
    readBytes(place.start, std::as_writable_bytes(std::span(text)));
    header_ = parsed([&] { return parseNpyHeader(text); });
    header_.dataStart = dataStart;
}

void NpyFile::checkSize() const {
    const std::uint64_t there = identity_.size - header_.dataStart;
    std::uint64_t needed = 0;
    const bool overflows = __builtin_mul_overflow(header_.vertices, 3 * header_.scalarSize, &needed) ||
                           __builtin_mul_overflow(needed, header_.frames, &needed);
    if (!overflows && needed == there)
        return;
    const std::string shape = "its shape is [" + std::to_string(header_.frames) + ", " +
                              std::to_string(header_.vertices) + ", 3] of " + std::to_string(header_.scalarSize) +
                              " bytes each";
    fail((overflows || needed > there ? "it is cut short: " : "it has more than its array: ") + shape + ", and " +
         std::to_string(there) + " bytes follow the header");
}

void NpyFile::read(std::size_t frame, std::size_t firstVertex, std::span<double> xyz) const {
    const std::size_t count = xyz.size() / 3;
    if (frame >= frameCount() || firstVertex > vertexCount() || count > vertexCount() - firstVertex)
        throw std::out_of_range("'" + path_ + "' has no vertices " + std::to_string(firstVertex) + " to " +
                                std::to_string(firstVertex + count) + " in a frame " + std::to_string(frame));
    // none of this can overflow: it lies within the file
    std::uint64_t from = header_.dataStart + (frame * vertexCount() + firstVertex) * 3 * header_.scalarSize;
    if (header_.scalarSize == sizeof(double))
        return readBytes(from, std::as_writable_bytes(xyz));
    std::array<float, 12288> singles; // 48 KiB: stays in the first cache
    while (!xyz.empty()) {
        const auto part = std::span(singles).first(std::min(singles.size(), xyz.size()));
        readBytes(from, std::as_writable_bytes(part));
        std::copy(part.begin(), part.end(), xyz.begin());
        xyz = xyz.subspan(part.size());
        from += part.size_bytes();
    }
}

void NpyFile::readBytes(std::uint64_t from, std::span<std::byte> bytes) const {
    const std::ptrdiff_t got = readAt(file_.number(), from, bytes);
    if (got < 0)
        fail(textOfErrno(errno));
    if (static_cast<std::size_t>(got) < bytes.size())
        fail("it has been cut short since it was opened");
}

void NpyFile::fail(const std::string& why) const {
    throw std::runtime_error("point cache '" + path_ + "' cannot be read: " + why);
}

} // namespace storage
