// SPDX-License-Identifier: Apache-2.0
// The source of a program, with the files that it includes in their places.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace OpenQuarn {

/// What a file was when it was read: another stamp is another file. Equal for files that are not there.
struct FileStamp {
    std::string path;
    std::int64_t seconds = 0, nanoseconds = 0;
    std::int64_t size = -1;
    bool operator==(const FileStamp&) const = default;
};

FileStamp stampOf(const std::string& path);

struct KernelSource {
    std::string text;
    /// The file, those it includes, and those that would be included before them if they were there.
    std::vector<FileStamp> stamps;
};

/// Puts each `#include "name"` and `#include <name>` that is found, beside the file that includes or in one of the
/// folders, in the line's place, with #line around it. An include that is not found is left to the compiler, and so is
/// one of a file that is being included already, as nothing; `#pragma once` holds. Throws std::runtime_error when
/// `file` cannot be read.
KernelSource readKernelSource(const std::string& file, const std::vector<std::string>& folders);

} // namespace OpenQuarn
