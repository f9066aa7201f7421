// SPDX-License-Identifier: Apache-2.0
#include "storage/Target.h"

#include "storage/FileError.h"

#include <cerrno>
#include <charconv>
#include <optional>
#include <string>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

namespace storage {
namespace {

namespace fs = std::filesystem;

constexpr int mostLinks = 40; // as many as the system follows

int standardOutput = -1; // set aside, see setStandardOutput()

std::optional<int> numberFrom(const std::string& text) {
    int number = -1;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc() || end != text.data() + text.size() || number < 0)
        return {};
    return number;
}

// of the names that the system has for open files of this process; opening one of them would begin a file anew
std::optional<int> descriptorNamed(const fs::path& path) {
    const fs::path name = path.lexically_normal();
    if (name == "/dev/stdout")
        return STDOUT_FILENO;
    if (name == "/dev/stderr")
        return STDERR_FILENO;
    const fs::path folder = name.parent_path();
    if (folder == "/dev/fd" || folder == "/proc/self/fd" || folder == "/proc/" + std::to_string(::getpid()) + "/fd")
        return numberFrom(name.filename());
    return {};
}

Descriptor duplicateOf(int number, const fs::path& path) {
    const int real = number == STDOUT_FILENO && standardOutput >= 0 ? standardOutput : number;
    Descriptor copy(::fcntl(real, F_DUPFD_CLOEXEC, 0));
    if (!copy.isOpen())
        failToWrite(path, errno);
    return copy;
}

bool isNull(const struct stat& status) {
    return S_ISCHR(status.st_mode) && status.st_rdev == makedev(1, 3);
}

Descriptor opened(const fs::path& place, const fs::path& path) {
    Descriptor file(::open(place.c_str(), O_WRONLY | O_CLOEXEC));
    if (!file.isOpen())
        failToWrite(path, errno);
    return file;
}

void requireInOrder(const fs::path& path, bool inOrder) {
    if (!inOrder)
        failToWrite(path, "it takes bytes one after the other only, and this kind of file is not written so");
}

fs::path linkAt(const fs::path& place, const fs::path& path) {
    std::error_code error;
    const fs::path link = fs::read_symlink(place, error);
    if (error)
        failToWrite(path, error.message());
    return place.parent_path() / link; // an absolute one stands for itself
}

/// The end of the links of a path, before anything is opened.
struct Place {
    enum class Kind { file, descriptor, stream } kind = Kind::file;
    fs::path path;
    int number = -1; ///< of the descriptor
};

Place placeOf(const fs::path& path) {
    fs::path place = path;
    for (int links = 0; links < mostLinks; ++links) {
        if (const std::optional<int> number = descriptorNamed(place))
            return {Place::Kind::descriptor, place, *number};
        struct stat status = {};
        const bool isThere = ::lstat(place.c_str(), &status) == 0;
        if (isThere && S_ISLNK(status.st_mode))
            place = linkAt(place, path);
        else
            return {isThere && (S_ISFIFO(status.st_mode) || isNull(status)) ? Place::Kind::stream : Place::Kind::file,
                    place};
    }
    failToWrite(path, ELOOP);
}

void requireFileName(const fs::path& file, const fs::path& path) {
    if (file.filename().empty() || file.filename() == "." || file.filename() == "..")
        failToWrite(path, file.empty() ? ENOENT : EISDIR);
}

// a folder that is there, or the one in which the missing ones will be made, takes new names
void requireFolder(const fs::path& folder, const fs::path& path) {
    fs::path at = folder.empty() ? "." : folder;
    struct stat status = {};
    while (::stat(at.c_str(), &status) != 0 && errno == ENOENT && at.has_relative_path())
        at = at.parent_path().empty() ? "." : at.parent_path();
    if (::faccessat(AT_FDCWD, at.c_str(), W_OK | X_OK, AT_EACCESS) != 0)
        failToWrite(path, errno);
    if (!S_ISDIR(status.st_mode))
        failToWrite(path, ENOTDIR);
}

} // namespace

void requireReplaceable(const fs::path& file, const fs::path& path) {
    struct stat status = {};
    if (::stat(file.c_str(), &status) != 0) {
        if (errno != ENOENT)
            failToWrite(path, errno);
        return;
    }
    if (S_ISDIR(status.st_mode))
        failToWrite(path, EISDIR);
    if (!S_ISREG(status.st_mode))
        failToWrite(path, "it is a device or a socket, and no file");
    if (::faccessat(AT_FDCWD, file.c_str(), W_OK, AT_EACCESS) != 0)
        failToWrite(path, errno);
}

Target findTarget(const fs::path& path, bool inOrder) {
    const Place place = placeOf(path);
    if (place.kind == Place::Kind::file) {
        requireFileName(place.path, path);
        requireReplaceable(place.path, path);
        return {place.path, Descriptor()};
    }
    requireInOrder(path, inOrder);
    return {{}, place.kind == Place::Kind::stream ? opened(place.path, path) : duplicateOf(place.number, path)};
}

bool isWrittenThrough(const fs::path& path) {
    return placeOf(path).kind != Place::Kind::file;
}

void requireWritable(const fs::path& path, bool inOrder) {
    const Place place = placeOf(path);
    if (place.kind == Place::Kind::descriptor)
        static_cast<void>(duplicateOf(place.number, path));
    if (place.kind != Place::Kind::file)
        return requireInOrder(path, inOrder);
    requireFileName(place.path, path);
    requireReplaceable(place.path, path);
    requireFolder(place.path.parent_path(), path);
}

void takePermissionsOf(const fs::path& target, int descriptor, const fs::path& path) {
    struct stat old = {};
    if (::stat(target.c_str(), &old) != 0)
        return;
    struct stat own = {};
    // where the group cannot be given, what the old group might do is not for the new one
    const bool sameGroup = ::fstat(descriptor, &own) == 0 &&
                           (own.st_gid == old.st_gid || ::fchown(descriptor, static_cast<uid_t>(-1), old.st_gid) == 0);
    if (::fchmod(descriptor, old.st_mode & (sameGroup ? 0777U : 0707U)) != 0)
        failToWrite(path, "it cannot keep its permissions: " + textOfErrno(errno));
}

void setStandardOutput(int descriptor) {
    standardOutput = descriptor;
}

} // namespace storage
