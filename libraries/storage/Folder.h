// SPDX-License-Identifier: Apache-2.0
// Folders: made with their parents, brought to the disk, exchanged.
#pragma once

#include <filesystem>
#include <vector>

namespace storage {

/// Makes the folder and its parents where they are missing, and answers those that were made, outermost first. `path`
/// is what the error names: FileError when one cannot be made; those made before are gone again. Thread: any.
std::vector<std::filesystem::path> makeFolders(const std::filesystem::path& folder, const std::filesystem::path& path);
/// Removes what makeFolders() has made, as far as nothing is in it.
void removeFolders(const std::vector<std::filesystem::path>& made);

/// Brings a file, or the names in a folder, to the disk. Throws FileError when the disk cannot take it.
void syncToDisk(const std::filesystem::path& path);
/// Brings the names in a folder to the disk where it can: what was renamed then survives a power failure. A disk that
/// cannot has the names all the same.
void flushNames(const std::filesystem::path& folder);

/// Gives a folder another name, which no folder has that is not empty. A file too, one that another program has made;
/// it takes the place of a file that is there. Throws FileError. Thread: any.
void moveFolder(const std::filesystem::path& from, const std::filesystem::path& to);

/// Puts `next` in the place of `folder`, and what was there in the place of `next`, in one step: `folder` is there at
/// any moment. Both are of one file system. Where that cannot do it (NFS, for one), in two steps, with an instant
/// between them in which `folder` is not there. Throws FileError; both are then as they were. Thread: any.
void exchangeFolders(const std::filesystem::path& next, const std::filesystem::path& folder);

} // namespace storage
