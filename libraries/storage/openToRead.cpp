// SPDX-License-Identifier: Apache-2.0
#include "storage/openToRead.h"

#include "storage/FileError.h"

#include <cerrno>

#include <fcntl.h>
#include <sys/stat.h>

namespace storage {
namespace {

void requireRegular(const std::filesystem::path& path, const struct stat& status) {
    if (!S_ISREG(status.st_mode))
        throw FileError(path, "is no regular file");
}

} // namespace

void failToRead(const std::filesystem::path& path, int error) {
    throw FileError(path, error == ENOENT ? "does not exist" : "cannot be read: " + textOfErrno(error));
}

void refuseSize(const std::filesystem::path& path, const std::string& size, std::uint64_t most) {
    throw FileError(path, "has " + size + " bytes, and at most " + std::to_string(most) + " are read");
}

// looked at before it is opened, which may already do something to a device, and after it, when it cannot change
// (decision 0128)
OpenFile openToRead(const std::filesystem::path& path, std::uint64_t most) {
    struct stat status = {};
    if (::stat(path.c_str(), &status) != 0)
        failToRead(path, errno);
    requireRegular(path, status);
    OpenFile file{Descriptor(::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC))};
    if (!file.descriptor.isOpen() || ::fstat(file.descriptor.number(), &status) != 0)
        failToRead(path, errno);
    requireRegular(path, status);
    file.size = static_cast<std::uint64_t>(status.st_size);
    if (file.size > most)
        refuseSize(path, std::to_string(file.size), most);
    return file;
}

} // namespace storage
