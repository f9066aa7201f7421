// SPDX-License-Identifier: Apache-2.0
#include "storage/readWholeFile.h"

#include "storage/Descriptor.h"
#include "storage/FileError.h"

#include <algorithm>
#include <cerrno>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace storage {
namespace {

[[noreturn]] void failToRead(const std::filesystem::path& path, int error) {
    throw FileError(path, error == ENOENT ? "does not exist" : "cannot be read: " + textOfErrno(error));
}

[[noreturn]] void refuseSize(const std::filesystem::path& path, const std::string& size, std::uint64_t most) {
    throw FileError(path, "has " + size + " bytes, and at most " + std::to_string(most) + " are read");
}

void requireRegular(const std::filesystem::path& path, const struct stat& status) {
    if (!S_ISREG(status.st_mode))
        throw FileError(path, "is no regular file");
}

// looked at before it is opened, which may already do something to a device, and after it, when it cannot change
// (decision 0128)
Descriptor opened(const std::filesystem::path& path, struct stat& status) {
    if (::stat(path.c_str(), &status) != 0)
        failToRead(path, errno);
    requireRegular(path, status);
    Descriptor file(::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC));
    if (!file.isOpen() || ::fstat(file.number(), &status) != 0)
        failToRead(path, errno);
    requireRegular(path, status);
    return file;
}

} // namespace

std::string readWholeFile(const std::filesystem::path& path, std::uint64_t most) {
    struct stat status = {};
    const Descriptor file = opened(path, status);
    const auto size = static_cast<std::uint64_t>(status.st_size);
    if (size > most)
        refuseSize(path, std::to_string(size), most);
    // one more than there are to be: files of the system have no size, and others grow
    std::string bytes(size + 1, '\0');
    std::size_t done = 0;
    for (;;) {
        const std::ptrdiff_t got = readAt(file.number(), done, std::as_writable_bytes(std::span(bytes)).subspan(done));
        if (got < 0)
            failToRead(path, errno);
        done += static_cast<std::size_t>(got);
        if (done > most)
            refuseSize(path, "more than " + std::to_string(most), most);
        if (done < bytes.size())
            break;
        bytes.resize(std::min<std::uint64_t>(2 * bytes.size() + 4096, most + 1));
    }
    bytes.resize(done);
    return bytes;
}

} // namespace storage
