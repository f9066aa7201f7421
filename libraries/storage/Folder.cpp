// SPDX-License-Identifier: Apache-2.0
#include "storage/Folder.h"

#include "storage/Descriptor.h"
#include "storage/FileError.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <string>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace storage {
namespace {

namespace fs = std::filesystem;

fs::path orHere(const fs::path& folder) {
    return folder.empty() ? "." : folder;
}

// errno of what it was refused for; 0 when it is done
int swapInOneStep(const fs::path& one, const fs::path& other) {
    return ::renameat2(AT_FDCWD, one.c_str(), AT_FDCWD, other.c_str(), RENAME_EXCHANGE) == 0 ? 0 : errno;
}

void giveName(const fs::path& from, const fs::path& to) {
    if (::rename(from.c_str(), to.c_str()) != 0)
        throw FileError(from, "could not be renamed to " + to.string() + ": " + textOfErrno(errno));
}

void swapInSteps(const fs::path& next, const fs::path& folder) {
    const fs::path aside = folder.string() + ".old" + std::to_string(::getpid());
    giveName(folder, aside);
    try {
        giveName(next, folder);
    } catch (const FileError&) {
        giveName(aside, folder);
        throw;
    }
    giveName(aside, next);
}

} // namespace

std::vector<fs::path> makeFolders(const fs::path& folder, const fs::path& path) {
    std::vector<fs::path> missing;
    struct stat status = {};
    for (fs::path at = folder; !at.empty() && ::stat(at.c_str(), &status) != 0 && errno == ENOENT;
         at = at.parent_path())
        missing.push_back(at);
    std::reverse(missing.begin(), missing.end());
    std::vector<fs::path> made;
    for (const fs::path& next : missing) {
        if (::mkdir(next.c_str(), 0777) == 0)
            made.push_back(next);
        else if (errno != EEXIST) { // another process may be as far
            const int error = errno;
            removeFolders(made);
            failToWrite(path, "its folder " + next.string() + " could not be made: " + textOfErrno(error));
        }
    }
    return made;
}

void removeFolders(const std::vector<fs::path>& made) {
    std::for_each(made.rbegin(), made.rend(), [](const fs::path& folder) { ::rmdir(folder.c_str()); });
}

void syncToDisk(const fs::path& path) {
    const Descriptor file(::open(orHere(path).c_str(), O_RDONLY | O_CLOEXEC));
    if (!file.isOpen() || ::fsync(file.number()) != 0)
        failToWrite(path, errno);
}

void flushNames(const fs::path& folder) {
    const Descriptor opened(::open(orHere(folder).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (opened.isOpen())
        static_cast<void>(::fsync(opened.number()));
}

void moveFolder(const fs::path& from, const fs::path& to) {
    giveName(from, to);
    flushNames(to.parent_path());
}

void exchangeFolders(const fs::path& next, const fs::path& folder) {
    const int error = swapInOneStep(next, folder);
    if (error == EINVAL || error == ENOSYS)
        swapInSteps(next, folder);
    else if (error != 0)
        throw FileError(folder, "could not be replaced by " + next.string() + ": " + textOfErrno(error));
    flushNames(folder.parent_path());
}

} // namespace storage
