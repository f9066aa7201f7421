// SPDX-License-Identifier: Apache-2.0
// Files that are there as a whole or not at all: the one policy of everything here that writes a file.
#pragma once

#include "storage/DescriptorStream.h"
#include "storage/Target.h"
#include "storage/TemporaryFile.h"

#include <filesystem>
#include <memory>
#include <span>
#include <string_view>
#include <vector>

namespace storage {

/// A file that is written beside its place and put there when it is complete. Without finish(), and after an error,
/// nothing is left of it, and what was there before stays.
///
/// - A symbolic link stays, and what it leads to is replaced; permissions stay, and the group where the system allows
///   it. A file that may not be written is not replaced either.
/// - Missing parent folders are made; they go again when the file does not come.
/// - A FIFO, /dev/null, /dev/stdout, /dev/stderr and /dev/fd/N stay what they are: finish() writes the whole into them.
///   Files that are not written in order are refused there, and all other devices always.
/// - What killed writers of the same file have left beside it is taken away (TemporaryFile).
///
/// Errors are FileError, naming the path as it was given and the reason. Thread: one at a time.
class WholeFile {
public:
    /// How the bytes come: one after the other, or also by rewind() or a library that moves about in temporary().
    enum class Writes { inOrder, anywhere };
    /// Throws what the constructor would, as far as that can be told without making anything: to be asked before a long
    /// computation whose result goes there.
    static void requirePossible(const std::filesystem::path& path, Writes writes = Writes::inOrder);

    /// Throws when the file could not be put into its place: nothing has to be computed to find that out.
    explicit WholeFile(const std::filesystem::path& path, Writes writes = Writes::inOrder);
    ~WholeFile();
    WholeFile(const WholeFile&) = delete;
    WholeFile& operator=(const WholeFile&) = delete;

    /// Binary, in the classic locale, whatever the user's. What goes wrong is said by finish().
    std::ostream& stream() { return *stream_; }
    /// Writes behind what the stream has got.
    void write(std::span<const std::byte> bytes);
    /// What is written next replaces what is at the beginning.
    void rewind();
    /// The file that a library may write instead of the stream. It opens it by this name and replaces nothing.
    const std::filesystem::path& temporary() const { return name_; }
    /// Brings everything to the disk and puts it into its place. Called once.
    void finish();

private:
    void flush();
    void writeThrough();

    std::filesystem::path path_; ///< as it was given
    Target target_;
    std::vector<std::filesystem::path> madeFolders_;
    std::unique_ptr<TemporaryFile> file_; ///< none for what is written through
    Descriptor memory_;                   ///< then this one
    std::filesystem::path name_;
    std::unique_ptr<DescriptorStream> stream_;
    bool isFinished_ = false;
};

/// Writes a text as a WholeFile.
void writeWhole(const std::filesystem::path& path, std::string_view text);

} // namespace storage
