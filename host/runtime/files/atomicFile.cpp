// SPDX-License-Identifier: Apache-2.0
#include "files/atomicFile.h"

#include <atomic>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <stdexcept>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace OpenQuarn {
namespace {

[[noreturn]] void fail(const std::string& what, int error) {
    throw std::runtime_error(what + ": " + std::generic_category().message(error));
}

/// A new file beside another, gone again unless it takes its place.
class TemporaryFile {
public:
    explicit TemporaryFile(const std::filesystem::path& beside)
        : target_(beside)
        , path_(beside.string() + temporaryEnding()) {
        descriptor_ = open(path_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666);
        if (descriptor_ < 0)
            fail("cannot write into its folder", errno);
    }
    ~TemporaryFile() {
        if (descriptor_ >= 0)
            close(descriptor_);
        if (!placed_)
            unlink(path_.c_str());
    }
    TemporaryFile(const TemporaryFile&) = delete;
    TemporaryFile& operator=(const TemporaryFile&) = delete;

    void takePermissionsOf(const std::filesystem::path& other) {
        struct stat old = {};
        if (stat(other.c_str(), &old) != 0)
            return; // there is none
        if (access(other.c_str(), W_OK) != 0)
            fail("cannot be written", errno);
        struct stat own = {};
        // where the group cannot be given, what the old group might do is not for the new one
        const bool sameGroup =
            fstat(descriptor_, &own) == 0 &&
            (own.st_gid == old.st_gid || fchown(descriptor_, static_cast<uid_t>(-1), old.st_gid) == 0);
        if (fchmod(descriptor_, old.st_mode & (sameGroup ? 0777U : 0707U)) != 0)
            fail("cannot keep its permissions", errno);
    }

    void write(std::string_view bytes) {
        while (!bytes.empty()) {
            const ssize_t written = ::write(descriptor_, bytes.data(), bytes.size());
            if (written < 0 && errno == EINTR)
                continue;
            if (written <= 0)
                fail("cannot be written", written < 0 ? errno : ENOSPC);
            bytes.remove_prefix(static_cast<std::size_t>(written));
        }
        if (fsync(descriptor_) != 0)
            fail("cannot be written", errno);
    }

    void takePlace() {
        const int closed = close(descriptor_);
        descriptor_ = -1;
        if (closed != 0)
            fail("cannot be written", errno);
        if (rename(path_.c_str(), target_.c_str()) != 0)
            fail("cannot be replaced", errno);
        placed_ = true;
    }

private:
    static std::string temporaryEnding() {
        static std::atomic<unsigned> number{0};
        return ".saving" + std::to_string(getpid()) + "_" + std::to_string(number++);
    }

    const std::filesystem::path target_;
    const std::filesystem::path path_;
    int descriptor_ = -1;
    bool placed_ = false;
};

// so that the rename itself survives a power failure; a disk that cannot do it has the file all the same
void flushFolder(const std::filesystem::path& folder) {
    const int descriptor = open(folder.empty() ? "." : folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (descriptor < 0)
        return;
    static_cast<void>(fsync(descriptor));
    close(descriptor);
}

std::filesystem::path withoutLinks(const std::filesystem::path& path) {
    std::error_code error;
    const bool isLink = std::filesystem::is_symlink(path, error);
    const std::filesystem::path real = isLink ? std::filesystem::weakly_canonical(path, error) : path;
    return error ? path : real;
}

} // namespace

std::string readFile(const std::filesystem::path& path) {
    std::error_code error;
    const std::filesystem::file_status status = std::filesystem::status(path, error);
    if (!std::filesystem::exists(status))
        throw std::runtime_error("does not exist");
    if (!std::filesystem::is_regular_file(status)) // a pipe would wait for a writer
        throw std::runtime_error("is no regular file");
    std::ifstream file(path, std::ios::binary);
    if (!file)
        fail("cannot be read", errno);
    std::string bytes(std::filesystem::file_size(path), '\0');
    file.read(bytes.data(), static_cast<std::streamsize>(bytes.size()));
    if (file.bad())
        fail("cannot be read", errno);
    bytes.resize(static_cast<std::size_t>(file.gcount())); // it may have been shortened meanwhile
    return bytes;
}

void replaceFile(const std::filesystem::path& path, std::string_view bytes) {
    const std::filesystem::path target = withoutLinks(path);
    TemporaryFile file(target);
    file.takePermissionsOf(target);
    file.write(bytes);
    file.takePlace();
    flushFolder(target.parent_path());
}

} // namespace OpenQuarn
