// SPDX-License-Identifier: Apache-2.0
#include "storage/FolderLock.h"

#include "storage/FileError.h"
#include "storage/LockedByAnother.h"

#include <cerrno>
#include <stdexcept>
#include <system_error>

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

namespace storage {
namespace {

[[noreturn]] void failToLock(const std::filesystem::path& folder, int error) {
    throw FileError(folder, "could not be locked: " + textOfErrno(error));
}

} // namespace

FolderLock::FolderLock(const std::filesystem::path& folder, const std::string& holder)
    : folder_(folder) {
    // another process may finish with the folder between two of these steps
    constexpr int attempts = 100;
    for (int attempt = 0; attempt < attempts; ++attempt)
        if (take(holder))
            return;
    throw LockedByAnother(folder_.string() + " is made and removed by others all the time; try again");
}

// false: the file that was locked is not the folder's any more
bool FolderLock::take(const std::string& holder) {
    std::error_code error;
    std::filesystem::create_directories(folder_, error);
    if (error)
        throw std::runtime_error("the folder " + folder_.string() + " could not be made: " + error.message());
    lock_ = Descriptor(::open(file().c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0666));
    if (!lock_.isOpen() && errno == ENOENT)
        return false;
    if (!lock_.isOpen())
        failToLock(folder_, errno);
    if (::flock(lock_.number(), LOCK_EX | LOCK_NB) != 0) {
        if (errno == EWOULDBLOCK)
            throw LockedByAnother(holder + " is writing " + folder_.string() + "; wait until it is done");
        failToLock(folder_, errno);
    }
    return isAt(file(), lock_.number());
}

// NFS gives an exclusive lock only to who may write the file, and a shared one, which says the same here, to who reads
bool FolderLock::isTaken(const std::filesystem::path& folder) {
    const Descriptor lock(::open((folder / fileName).c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    return lock.isOpen() && ::flock(lock.number(), LOCK_SH | LOCK_NB) != 0 && errno == EWOULDBLOCK;
}

FolderLock::~FolderLock() {
    ::unlink(file().c_str());
    lock_.close();            // NFS keeps an open file in its folder
    ::rmdir(folder_.c_str()); // refused when there is more in it
}

} // namespace storage
