// SPDX-License-Identifier: Apache-2.0
// What a path that is to be written leads to.
#pragma once

#include "storage/Descriptor.h"

#include <filesystem>

namespace storage {

/// Where bytes for a path go: to a file, which is replaced, or through to what takes them as they come.
struct Target {
    std::filesystem::path file; ///< to be replaced or made: no link; empty for the other kind
    Descriptor through;         ///< open: a FIFO, /dev/null, or a descriptor of this process
    bool isFile() const { return !file.empty(); }
};

/// Follows the links of `path`. /dev/stdout, /dev/stderr and /dev/fd/N (also below /proc/self) are this process's
/// descriptors. A FIFO is opened, which waits for a reader. `inOrder` says whether the bytes come one after the other:
/// where not, only a file will do. Throws FileError for a folder, another device, a socket, and a file that may not be
/// written. Thread: any.
Target findTarget(const std::filesystem::path& path, bool inOrder);

/// Whether what is written there goes through, and not into a file that is replaced. Throws FileError for links without
/// an end.
bool isWrittenThrough(const std::filesystem::path& path);

/// Throws what findTarget() would, and opens nothing. Also when the folder may not be written, or could not be made.
void requireWritable(const std::filesystem::path& path, bool inOrder);

/// Throws FileError when there is something at `file` that must not be replaced: nothing but a file that may be
/// written by this process is. `path` is what the error names.
void requireReplaceable(const std::filesystem::path& file, const std::filesystem::path& path);

/// Gives an open file the permissions of the one whose place it is going to take, and its group where the system allows
/// it; nothing where there is none. `path` is what the error names: FileError where it cannot have them. Thread: any.
void takePermissionsOf(const std::filesystem::path& target, int descriptor, const std::filesystem::path& path);

/// Where standard output goes for findTarget(), while it is set aside for libraries that print on it; -1 for where it
/// always goes. Thread: main.
void setStandardOutput(int descriptor);

} // namespace storage
