// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/FileSums.h"

#include "storage/Descriptor.h"
#include "storage/FileError.h"
#include "storage/Fnv64.h"
#include "storage/framePattern.h"

#include <cerrno>
#include <set>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>

namespace quarn {
namespace {

namespace fs = std::filesystem;

[[noreturn]] void failToRead(const fs::path& path, int error) {
    throw storage::FileError(path, "could not be read: " + storage::textOfErrno(error));
}

std::string sumOf(const fs::path& file) {
    const storage::Descriptor opened(::open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (!opened.isOpen())
        failToRead(file, errno);
    storage::Fnv64 sum;
    std::vector<std::byte> piece(std::size_t{1} << 20U);
    for (std::uint64_t at = 0;;) {
        const std::ptrdiff_t count = storage::readAt(opened.number(), at, piece);
        if (count < 0)
            failToRead(file, errno);
        if (count == 0)
            return sum.text();
        sum.add(std::span(piece).first(static_cast<std::size_t>(count)));
        at += static_cast<std::uint64_t>(count);
    }
}

} // namespace

std::string FileSums::of(const fs::path& path) {
    const fs::path whole = folder_ / path;
    std::error_code error;
    std::set<fs::path> files; // in order
    fs::path folder = path;
    if (fs::is_directory(whole, error)) {
        for (const fs::directory_entry& entry : fs::recursive_directory_iterator(whole))
            if (!entry.is_directory())
                files.insert(entry.path().lexically_relative(whole));
    } else if (storage::isFramePattern(path) && !fs::exists(whole, error)) {
        folder = path.parent_path();
        for (const int frame : storage::framesOf(whole))
            files.insert(storage::frameFile(path.filename(), frame));
        if (files.empty())
            return {};
    } else {
        return ofFile(path);
    }
    std::string text;
    for (const fs::path& file : files)
        text += file.string() + '\0' + ofFile(folder / file) + '\0';
    storage::Fnv64 sum;
    sum.add(std::as_bytes(std::span(text)));
    return sum.text();
}

std::string FileSums::ofFile(const fs::path& path) {
    const fs::path whole = folder_ / path;
    struct stat status = {};
    if (::stat(whole.c_str(), &status) != 0) {
        if (errno == ENOENT || errno == ENOTDIR)
            return {};
        failToRead(whole, errno);
    }
    if (!S_ISREG(status.st_mode))
        throw storage::FileError(whole, "is no file");
    constexpr std::int64_t second = 1'000'000'000;
    const Seen now{
        {}, static_cast<std::uint64_t>(status.st_size), status.st_mtim.tv_sec * second + status.st_mtim.tv_nsec};
    Seen& known = seen[path.string()];
    if (known.sum.empty() || known.bytes != now.bytes || known.changed != now.changed)
        known = {sumOf(whole), now.bytes, now.changed};
    return known.sum;
}

} // namespace quarn
