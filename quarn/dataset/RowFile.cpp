// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/RowFile.h"

#include <algorithm>
#include <bit>
#include <cerrno>
#include <stdexcept>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace quarn {
namespace {

static_assert(std::endian::native == std::endian::little, "numbers are written as they lie in memory");

constexpr std::size_t headSize = 128; // keeps the numbers aligned to 64 bytes, with room for any shape
constexpr std::size_t numberSize = 4;

} // namespace

std::uint64_t ArrayLayout::rowBytes() const {
    std::uint64_t bytes = numberSize;
    for (std::size_t dimension = 1; dimension < shape.size(); ++dimension)
        bytes *= shape[dimension];
    return bytes;
}

// Source: the NPY format, version 1.0, as NumPy's documentation of numpy.lib.format describes it
std::string ArrayLayout::head() const {
    std::string text("\x93NUMPY\1\0", 8);
    text += {static_cast<char>(headSize - 10), '\0'};
    text += "{'descr': '" + type + "', 'fortran_order': False, 'shape': (";
    for (std::size_t dimension = 0; dimension < shape.size(); ++dimension)
        text += (dimension > 0 ? ", " : "") + std::to_string(shape[dimension]);
    text += shape.size() == 1 ? ",), }" : "), }";
    text.resize(headSize - 1, ' ');
    return text += '\n';
}

RowFile::RowFile(std::filesystem::path path, ArrayLayout layout)
    : path_(std::move(path))
    , layout_(std::move(layout)) {}

void RowFile::begin() {
    ::unlink(path_.c_str()); // what is there may be a link
    file_ = storage::Descriptor(::open(path_.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0666));
    if (!file_.isOpen())
        fail(errno);
    sum_ = Fnv64();
    const std::string head = layout_.head();
    append(std::as_bytes(std::span(head)));
}

// a pipe would wait for somebody who writes into it: O_NONBLOCK opens it at once, and then it is refused
bool RowFile::resume(std::uint64_t rows, const std::string& sum) {
    file_ = storage::Descriptor(::open(path_.c_str(), O_RDWR | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    struct stat status = {};
    if (rows > layout_.shape[0] || !file_.isOpen() || ::fstat(file_.number(), &status) != 0 || !S_ISREG(status.st_mode))
        return false;
    const auto size = static_cast<std::uint64_t>(status.st_size);
    const std::uint64_t wanted = headSize + rows * layout_.rowBytes();
    if (size < wanted || size > headSize + layout_.shape[0] * layout_.rowBytes() || !hasSum(wanted, sum))
        return false;
    cut(rows);
    return true;
}

bool RowFile::hasSum(std::uint64_t bytes, const std::string& sum) {
    constexpr std::uint64_t blockSize = 1U << 18U;
    std::vector<std::byte> block(std::min(bytes, blockSize));
    sum_ = Fnv64();
    for (std::uint64_t done = 0; done < bytes;) {
        const ssize_t got =
            ::pread(file_.number(), block.data(), std::min(bytes - done, blockSize), static_cast<off_t>(done));
        if (got < 0 && errno == EINTR)
            continue;
        if (got <= 0)
            return false;
        sum_.add(std::span(block).first(static_cast<std::size_t>(got)));
        done += static_cast<std::uint64_t>(got);
    }
    return sum_.text() == sum;
}

void RowFile::append(std::span<const std::byte> row) {
    sum_.add(row);
    if (const int error = storage::writeAll(file_.number(), row))
        fail(error);
}

void RowFile::cut(std::uint64_t rows) {
    const auto size = static_cast<off_t>(headSize + rows * layout_.rowBytes());
    if (::ftruncate(file_.number(), size) != 0 || ::lseek(file_.number(), 0, SEEK_END) != size)
        fail(errno);
}

void RowFile::sync() {
    if (::fsync(file_.number()) != 0)
        fail(errno);
}

void RowFile::fail(int error) const {
    throw std::runtime_error(path_.string() + " could not be written: " + std::generic_category().message(error));
}

} // namespace quarn
