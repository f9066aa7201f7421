// SPDX-License-Identifier: Apache-2.0
#include "rig/NpyFile.h"
#include "rig/finite.h"

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <stdexcept>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>

namespace rig {
namespace {

std::string withoutLinks(const std::string& path) {
    std::error_code error;
    if (!std::filesystem::is_symlink(path, error))
        return path;
    const std::filesystem::path real = std::filesystem::weakly_canonical(path, error);
    return error ? path : real.string();
}

/// A name that nobody else in this process or another one of this machine makes.
std::string temporaryFor(const std::string& target) {
    static std::atomic<unsigned> number{0};
    return target + ".writing" + std::to_string(getpid()) + "_" + std::to_string(number++);
}

/// So that the new name itself survives a power failure; a disk that cannot do it has the file all the same.
void flushFolderOf(const std::string& path) {
    const std::filesystem::path folder = std::filesystem::path(path).parent_path();
    const FileDescriptor opened(open(folder.empty() ? "." : folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (opened.isOpen())
        static_cast<void>(fsync(opened.number()));
}

} // namespace

NpyWriter::NpyWriter(const std::string& path, std::size_t vertexCount)
    : path_(path)
    , target_(withoutLinks(path))
    , temporary_(temporaryFor(target_))
    , file_(open(temporary_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666))
    , vertexCount_(vertexCount) {
    if (!file_.isOpen())
        fail("cannot be written into its folder", errno);
    try {
        takePermissionsOfTarget();
        // no header yet: what a crash leaves is no array for anybody
        const std::string room(npyHeadSize, '\0');
        write(std::as_bytes(std::span(room)));
    } catch (...) {
        unlink(temporary_.c_str()); // there is no destructor after this
        throw;
    }
}

NpyWriter::~NpyWriter() {
    if (!temporary_.empty())
        unlink(temporary_.c_str());
}

void NpyWriter::takePermissionsOfTarget() {
    struct stat old = {};
    if (stat(target_.c_str(), &old) != 0)
        return; // there is none
    if (S_ISDIR(old.st_mode))
        fail("cannot be written", EISDIR);
    if (access(target_.c_str(), W_OK) != 0)
        fail("cannot be written", errno);
    if (fchmod(file_.number(), old.st_mode & 0777U) != 0)
        fail("cannot keep its permissions", errno);
}

void NpyWriter::append(std::span<const float> xyz) {
    if (xyz.size() % 3 != 0 || xyz.size() / 3 != vertexCount_)
        throw std::invalid_argument("point cache '" + path_ + "' has " + std::to_string(vertexCount_) +
                                    " vertices a frame, and is given " + std::to_string(xyz.size()) + " numbers");
    if (const std::optional<std::size_t> place = firstNotFinite(xyz))
        throw std::runtime_error("point cache '" + path_ + "': vertex " + std::to_string(*place / 3) +
                                 " of its frame " + std::to_string(frames_) +
                                 " has a coordinate that is no finite number");
    requireUsable();
    write(std::as_bytes(xyz));
    ++frames_;
}

void NpyWriter::finish() {
    const std::string head = makeNpyHead(frames_, vertexCount_);
    requireUsable();
    if (lseek(file_.number(), 0, SEEK_SET) != 0)
        fail("cannot be written", errno);
    write(std::as_bytes(std::span(head)));
    if (fsync(file_.number()) != 0 || !file_.close())
        fail("cannot be written", errno);
    if (rename(temporary_.c_str(), target_.c_str()) != 0)
        fail("cannot be put into its place", errno);
    temporary_.clear();
    flushFolderOf(target_);
}

void NpyWriter::requireUsable() const {
    if (failed_ || !file_.isOpen())
        throw std::logic_error("point cache '" + path_ + "' is finished, or has failed before");
}

void NpyWriter::write(std::span<const std::byte> bytes) {
    while (!bytes.empty()) {
        const ssize_t written = ::write(file_.number(), bytes.data(), bytes.size());
        if (written < 0 && errno == EINTR)
            continue;
        if (written <= 0)
            fail("cannot be written", written < 0 ? errno : ENOSPC);
        bytes = bytes.subspan(static_cast<std::size_t>(written));
    }
}

void NpyWriter::fail(const std::string& what, int error) {
    failed_ = true;
    throw std::runtime_error("point cache '" + path_ + "' " + what + ": " + std::generic_category().message(error));
}

} // namespace rig
