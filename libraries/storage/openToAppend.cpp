// SPDX-License-Identifier: Apache-2.0
#include "storage/openToAppend.h"

#include "storage/FileError.h"
#include "storage/Folder.h"
#include "storage/Target.h"

#include <cerrno>
#include <string>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

namespace storage {
namespace {

namespace fs = std::filesystem;

Descriptor openedOrMade(const fs::path& file, const fs::path& path) {
    const std::vector<fs::path> made = makeFolders(file.parent_path(), path);
    Descriptor opened(::open(file.c_str(), O_RDWR | O_APPEND | O_CREAT | O_CLOEXEC, 0666));
    if (const int error = errno; !opened.isOpen()) {
        removeFolders(made);
        failToWrite(path, error);
    }
    return opened;
}

void requireMark(const Descriptor& file, std::string_view mark, const fs::path& path) {
    std::string begin(mark.size(), '\0');
    const ssize_t size = ::pread(file.number(), begin.data(), begin.size(), 0);
    if (size < 0)
        failToWrite(path, errno);
    if (size > 0 && (static_cast<std::size_t>(size) < mark.size() || begin != mark))
        throw FileError(path, "is there already and is another kind of file: what it holds would be spoiled");
}

} // namespace

Descriptor openToAppend(const fs::path& path, std::string_view mark) {
    Target target = findTarget(path, true);
    if (!target.isFile())
        return std::move(target.through);
    Descriptor file = openedOrMade(target.file, path);
    requireMark(file, mark, path);
    return file;
}

} // namespace storage
