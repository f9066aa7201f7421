// SPDX-License-Identifier: Apache-2.0
#include "storage/WholeFile.h"

#include "storage/FileError.h"
#include "storage/Folder.h"

#include <array>
#include <cerrno>
#include <string>

#include <sys/mman.h>
#include <unistd.h>

namespace storage {

namespace fs = std::filesystem;

WholeFile::WholeFile(const fs::path& path, Writes writes)
    : path_(path)
    , target_(findTarget(path, writes == Writes::inOrder)) {
    if (target_.isFile()) {
        madeFolders_ = makeFolders(target_.file.parent_path(), path_);
        try {
            file_ = std::make_unique<TemporaryFile>(target_.file, path_);
            file_->takePermissions();
        } catch (...) {
            file_.reset();
            removeFolders(madeFolders_); // there is no destructor after this
            throw;
        }
        name_ = file_->path();
    } else {
        memory_ = Descriptor(::memfd_create("whole", MFD_CLOEXEC));
        if (!memory_.isOpen())
            failToWrite(path_, errno);
        name_ = "/proc/self/fd/" + std::to_string(memory_.number());
    }
    stream_ = std::make_unique<DescriptorStream>(file_ ? file_->descriptor() : memory_.number());
}

void WholeFile::requirePossible(const fs::path& path, Writes writes) {
    requireWritable(path, writes == Writes::inOrder);
}

WholeFile::~WholeFile() {
    if (isFinished_)
        return;
    file_.reset();
    removeFolders(madeFolders_);
}

void WholeFile::flush() {
    stream_->flush();
    if (stream_->error() != 0)
        failToWrite(path_, stream_->error());
    if (!*stream_)
        failToWrite(path_, "not all of it came to its stream");
}

void WholeFile::write(std::span<const std::byte> bytes) {
    stream_->write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
    if (!*stream_)
        flush();
}

void WholeFile::rewind() {
    flush();
    if (::lseek(file_ ? file_->descriptor() : memory_.number(), 0, SEEK_SET) != 0)
        failToWrite(path_, errno);
}

void WholeFile::finish() {
    flush();
    if (file_)
        file_->publish();
    else
        writeThrough();
    isFinished_ = true;
}

void WholeFile::writeThrough() {
    std::array<std::byte, 1U << 16U> block{};
    for (std::uint64_t done = 0;;) {
        const std::ptrdiff_t got = readAt(memory_.number(), done, block);
        if (got < 0)
            failToWrite(path_, errno);
        if (got == 0)
            return;
        if (const int error = writeAll(target_.through.number(), std::span(block).first(static_cast<std::size_t>(got))))
            failToWrite(path_, error);
        done += static_cast<std::size_t>(got);
    }
}

void writeWhole(const fs::path& path, std::string_view text) {
    WholeFile file(path);
    file.write(std::as_bytes(std::span(text)));
    file.finish();
}

} // namespace storage
