// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "storage/Descriptor.h"

#include <filesystem>
#include <string>

namespace storage {

/// Keeps a folder for this process, against others that ask for the same, by a lock on a file "lock" in it. The system
/// takes the lock away with the process, however that ends. Thread: one at a time.
class FolderLock {
public:
    /// Makes the folder when there is none. `holder` is who has it when it is taken, as the error names it: "another
    /// quarn export". Throws LockedByAnother when it is taken, std::runtime_error when it cannot be made.
    FolderLock(const std::filesystem::path& folder, const std::string& holder);
    /// Removes its file, and the folder when nothing else is in it.
    ~FolderLock();
    FolderLock(const FolderLock&) = delete;
    FolderLock& operator=(const FolderLock&) = delete;

    /// The folder has another name now.
    void follow(const std::filesystem::path& folder) { folder_ = folder; }
    /// Whether another process has locked the folder now. Also of a folder that this process may only read.
    static bool isTaken(const std::filesystem::path& folder);

    static constexpr const char* fileName = "lock";

private:
    bool take(const std::string& holder);
    std::filesystem::path file() const { return folder_ / fileName; }

    std::filesystem::path folder_;
    Descriptor lock_;
};

} // namespace storage
