// SPDX-License-Identifier: Apache-2.0
#include "storage/FileIdentity.h"

#include "storage/FileError.h"

#include <cerrno>
#include <stdexcept>

#include <sys/stat.h>

namespace storage {
namespace {

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

FileIdentity identityOf(int descriptor) {
    struct stat status = {};
    if (fstat(descriptor, &status) != 0)
        throw std::runtime_error(textOfErrno(errno));
    if (!S_ISREG(status.st_mode))
        throw std::runtime_error("it is no regular file");
    return identityFrom(status);
}

} // namespace storage
