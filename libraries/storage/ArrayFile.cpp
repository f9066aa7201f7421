// SPDX-License-Identifier: Apache-2.0
#include "storage/ArrayFile.h"

#include "storage/FileError.h"
#include "storage/openToRead.h"

#include <algorithm>
#include <cerrno>
#include <stdexcept>

#include <fcntl.h>
#include <unistd.h>

namespace storage {
namespace {

constexpr std::uint64_t blockSize = 1U << 22U; // between two words to whoever waits

std::size_t sizeOfNumber(const std::string& descr) {
    if (descr == "<f4" || descr == "<i4")
        return 4;
    if (descr == "<f8")
        return 8;
    throw std::runtime_error("its numbers are '" + descr + "', where '<f4', '<f8' or '<i4' are read");
}

[[noreturn]] void failToReadAll(const std::filesystem::path& path, const std::runtime_error& why) {
    throw FileError(path, "cannot be read: " + std::string(why.what()));
}

// 0, or the errno of what kept it from all of it; `done` is how much came
int copyBySystem(int from, std::uint64_t start, int to, std::uint64_t size, std::uint64_t& done) {
    auto at = static_cast<off64_t>(start);
    while (done < size) {
        const ssize_t got = ::copy_file_range(from, &at, to, nullptr, size - done, 0);
        if (got < 0 && errno == EINTR)
            continue;
        if (got <= 0)
            return got < 0 ? errno : EIO;
        done += static_cast<std::uint64_t>(got);
    }
    return 0;
}

/// A file that grows by pieces of others.
class Joined {
public:
    explicit Joined(const std::filesystem::path& path)
        : path_(path)
        , file_(::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_CLOEXEC, 0666)) {
        if (!file_.isOpen())
            failToWrite(path_, errno);
    }

    void write(std::span<const std::byte> bytes) const {
        if (const int error = writeAll(file_.number(), bytes))
            failToWrite(path_, error);
    }

    /// At most a block. What the system cannot copy, as between two file systems, goes through memory, where errors
    /// have names as well.
    void copy(const std::filesystem::path& place, const FileBytes& piece) {
        std::uint64_t done = 0;
        if (isCopiedBySystem_ && copyBySystem(piece.descriptor, piece.start, file_.number(), piece.size, done) == 0)
            return;
        isCopiedBySystem_ = false;
        block_.resize(piece.size - done);
        try {
            piece.read(done, block_);
        } catch (const std::runtime_error& why) {
            failToReadAll(place, why);
        }
        write(block_);
    }

    void sync() {
        if (::fsync(file_.number()) != 0 || !file_.close())
            failToWrite(path_, errno);
    }

private:
    std::filesystem::path path_;
    Descriptor file_;
    bool isCopiedBySystem_ = true;
    std::vector<std::byte> block_;
};

} // namespace

ArrayFile::ArrayFile(const std::filesystem::path& path)
    : path_(path) {
    OpenFile opened = openToRead(path, UINT64_MAX);
    file_ = std::move(opened.descriptor);
    try {
        load(opened.size);
    } catch (const std::runtime_error& why) {
        throw FileError(path, "is damaged: " + std::string(why.what()));
    }
}

void ArrayFile::load(std::uint64_t size) {
    const FileBytes bytes{file_.number(), 0, size};
    const NpyPlace place = findNpyHeader(bytes.text(0, npyPreambleSize));
    start_ = place.start + place.length;
    if (start_ > size)
        throw std::runtime_error("it is cut short within its header");
    array_ = parseNpyArray(bytes.text(place.start, place.length));
    if (array_.shape.empty())
        throw std::runtime_error("it is a single number");
    rowBytes_ = sizeOfNumber(array_.descr);
    requireNpySize(array_, rowBytes_, size - start_);
    for (std::size_t dimension = 1; dimension < array_.shape.size(); ++dimension)
        if (__builtin_mul_overflow(rowBytes_, array_.shape[dimension], &rowBytes_))
            throw std::runtime_error("its shape " + npyShapeText(array_.shape) + " is too large");
}

void ArrayFile::read(std::uint64_t first, std::span<std::byte> bytes) const {
    try {
        numbers().read(first * rowBytes_, bytes);
    } catch (const std::runtime_error& why) {
        failToReadAll(path_, why);
    }
}

void joinArrays(const std::filesystem::path& path, const std::vector<std::filesystem::path>& pieces,
                const std::vector<std::uint64_t>& shape, const std::function<void(std::uint64_t bytes)>& copied) {
    Joined joined(path);
    for (const std::filesystem::path& place : pieces) {
        const ArrayFile piece(place);
        if (&place == &pieces.front()) {
            const std::string head = makeNpyHead(piece.array().descr, shape);
            joined.write(std::as_bytes(std::span(head)));
        }
        const FileBytes numbers = piece.numbers();
        for (std::uint64_t done = 0; done < numbers.size; done += blockSize) {
            const std::uint64_t next = std::min(blockSize, numbers.size - done);
            joined.copy(place, numbers.part(done, next));
            copied(next);
        }
    }
    joined.sync();
    try {
        static_cast<void>(ArrayFile(path)); // as a part may have changed meanwhile
    } catch (const FileError& why) {
        throw FileError(path, "was not joined, as a part has changed meanwhile: it " + why.predicate());
    }
}

} // namespace storage
