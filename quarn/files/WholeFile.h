// SPDX-License-Identifier: Apache-2.0
// Files that are there as a whole or not at all.
#pragma once

#include <filesystem>
#include <fstream>
#include <string>

namespace quarn {

/// A file that is written beside its place and put there when it is complete. Without finish(), and after an error,
/// nothing is left of it, and what was there before stays. Errors are std::runtime_error with a sentence that names
/// the path and the reason. Thread: one at a time.
class WholeFile {
public:
    /// Makes the temporary file. Throws when the folder does not exist or cannot be written into.
    explicit WholeFile(const std::filesystem::path& path);
    ~WholeFile();
    WholeFile(const WholeFile&) = delete;
    WholeFile& operator=(const WholeFile&) = delete;

    /// Binary, in the classic locale, whatever the user's.
    std::ostream& stream() { return stream_; }
    /// The file that a library may write instead of the stream; close nothing, it is looked for there by finish().
    const std::filesystem::path& temporary() const { return temporary_; }
    /// Brings everything to the disk and puts it into its place; the permissions of a replaced file stay. Called once.
    void finish();

private:
    std::filesystem::path path_;
    std::filesystem::path temporary_;
    std::ofstream stream_;
    bool finished_ = false;
};

/// Writes a text as a WholeFile.
void writeWhole(const std::filesystem::path& path, const std::string& text);

/// Brings a file, or the names in a folder, to the disk. Throws std::runtime_error, naming the path, when the disk
/// cannot take it.
void syncToDisk(const std::filesystem::path& path);

} // namespace quarn
