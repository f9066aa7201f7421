// SPDX-License-Identifier: Apache-2.0
#include "storage/NpyRows.h"

#include "storage/FileError.h"
#include "storage/Folder.h"
#include "storage/Target.h"
#include "storage/npyHeader.h"

#include <algorithm>
#include <bit>
#include <cerrno>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace storage {
namespace {

static_assert(std::endian::native == std::endian::little, "numbers are written as they lie in memory");

constexpr std::size_t numberSize = 4;

} // namespace

std::uint64_t ArrayLayout::rowBytes() const {
    std::uint64_t bytes = numberSize;
    for (std::size_t dimension = 1; dimension < shape.size(); ++dimension)
        bytes *= shape[dimension];
    return bytes;
}

NpyRows::NpyRows(std::filesystem::path path, ArrayLayout layout)
    : path_(std::move(path))
    , layout_(std::move(layout)) {}

void NpyRows::begin() {
    ::unlink(path_.c_str()); // what is there may be a link
    file_ = Descriptor(::open(path_.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0666));
    if (!file_.isOpen())
        failToWrite(path_, errno);
    sum_ = std::make_unique<ByteSum>();
    const std::string head = makeNpyHead(layout_.type, layout_.shape);
    append(std::as_bytes(std::span(head)));
}

// a pipe would wait for somebody who writes into it: O_NONBLOCK opens it at once, and then it is refused
bool NpyRows::resume(std::uint64_t rows, const std::string& sum) {
    file_ = Descriptor(::open(path_.c_str(), O_RDWR | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    struct stat status = {};
    if (rows > layout_.shape[0] || !file_.isOpen() || ::fstat(file_.number(), &status) != 0 || !S_ISREG(status.st_mode))
        return false;
    const auto size = static_cast<std::uint64_t>(status.st_size);
    const std::uint64_t wanted = npyHeadSize + rows * layout_.rowBytes();
    if (size < wanted || size > npyHeadSize + layout_.shape[0] * layout_.rowBytes() || !hasSum(wanted, sum))
        return false;
    cut(rows);
    return true;
}

bool NpyRows::hasSum(std::uint64_t bytes, const std::string& sum) {
    constexpr std::uint64_t blockSize = 1U << 18U;
    std::vector<std::byte> block(std::min(bytes, blockSize));
    sum_ = std::make_unique<ByteSum>();
    for (std::uint64_t done = 0; done < bytes; done += blockSize) {
        const std::span part = std::span(block).first(std::min(bytes - done, blockSize));
        if (readAt(file_.number(), done, part) != static_cast<std::ptrdiff_t>(part.size()))
            return false;
        sum_->add(part);
    }
    return sum_->digits() == sum;
}

void NpyRows::append(std::span<const std::byte> row) {
    sum_->add(row);
    if (const int error = writeAll(file_.number(), row))
        failToWrite(path_, error);
}

void NpyRows::read(std::uint64_t row, std::span<std::byte> bytes) const {
    if (readAt(file_.number(), npyHeadSize + row * layout_.rowBytes(), bytes) !=
        static_cast<std::ptrdiff_t>(bytes.size()))
        throw FileError(path_, "could not be read: " + textOfErrno(errno));
}

void NpyRows::cut(std::uint64_t rows) {
    const auto size = static_cast<off_t>(npyHeadSize + rows * layout_.rowBytes());
    if (::ftruncate(file_.number(), size) != 0 || ::lseek(file_.number(), 0, SEEK_END) != size)
        failToWrite(path_, errno);
}

void NpyRows::sync() {
    if (::fsync(file_.number()) != 0)
        failToWrite(path_, errno);
}

void NpyRows::publish(const std::filesystem::path& file) {
    takePermissionsOf(file, file_.number(), file);
    sync();
    requireReplaceable(file, file);
    moveFolder(path_, file);
}

} // namespace storage
