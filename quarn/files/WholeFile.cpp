// SPDX-License-Identifier: Apache-2.0
#include "quarn/files/WholeFile.h"

#include <cerrno>
#include <cstring>
#include <stdexcept>

#include <fcntl.h>
#include <unistd.h>

namespace quarn {
namespace {

[[noreturn]] void fail(const std::filesystem::path& path, const std::string& reason) {
    throw std::runtime_error(path.string() + " could not be written: " + reason);
}

// one name a process and target: two commands that write the same file each write their own
std::filesystem::path besideTarget(const std::filesystem::path& target) {
    std::filesystem::path name = target;
    name += ".part" + std::to_string(::getpid());
    return name;
}

// where the path is a link, what it leads to is replaced, not the link
std::filesystem::path targetOf(const std::filesystem::path& path) {
    std::error_code error;
    const std::filesystem::path target = std::filesystem::weakly_canonical(path, error);
    return error ? path : target;
}

} // namespace

void syncToDisk(const std::filesystem::path& path) {
    const int file = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    const bool done = file >= 0 && ::fsync(file) == 0;
    const int error = errno;
    if (file >= 0)
        ::close(file);
    if (!done)
        fail(path, std::strerror(error));
}

WholeFile::WholeFile(const std::filesystem::path& path)
    : path_(targetOf(path))
    , temporary_(besideTarget(path_)) {
    stream_.imbue(std::locale::classic());
    stream_.open(temporary_, std::ios::binary | std::ios::trunc);
    if (!stream_)
        fail(path, std::strerror(errno));
}

WholeFile::~WholeFile() {
    if (finished_)
        return;
    stream_.close();
    std::error_code ignored; // it may never have come to be
    std::filesystem::remove(temporary_, ignored);
}

void WholeFile::finish() {
    errno = 0;
    stream_.close();
    if (!stream_)
        fail(path_, errno != 0 ? std::strerror(errno) : "the disk did not take all of it");
    syncToDisk(temporary_);
    std::error_code error;
    const auto status = std::filesystem::status(path_, error);
    if (!error && std::filesystem::exists(status))
        std::filesystem::permissions(temporary_, status.permissions(), error);
    std::filesystem::rename(temporary_, path_, error);
    if (error)
        fail(path_, error.message());
    finished_ = true;
    syncToDisk(path_.parent_path().empty() ? "." : path_.parent_path());
}

void writeWhole(const std::filesystem::path& path, const std::string& text) {
    WholeFile file(path);
    file.stream() << text;
    file.finish();
}

} // namespace quarn
