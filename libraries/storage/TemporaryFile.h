// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "storage/Descriptor.h"

#include <filesystem>
#include <string_view>

namespace storage {

/// A new file beside the one whose place it will take, gone with its owner unless it did. Its name is short whatever
/// the target's, and made of the target's name, this host and its boot, and a number; the file is locked (flock) for
/// as long as its writer lives. So what a killed writer left can be told from what a living one is at, in whatever PID
/// name space that is: the next one for the same target takes away those that carry the mark of this host and boot and
/// whose lock it gets. Where files cannot be locked nothing is taken away. Decision 0127 has the reasons.
/// Errors are FileError. Thread: any; one at a time for one object.
class TemporaryFile {
public:
    /// `target` no link, in a folder that exists; errors name `path`.
    TemporaryFile(const std::filesystem::path& target, const std::filesystem::path& path);
    ~TemporaryFile();
    TemporaryFile(const TemporaryFile&) = delete;
    TemporaryFile& operator=(const TemporaryFile&) = delete;

    int descriptor() const { return file_.number(); }
    const std::filesystem::path& path() const { return name_; }
    /// Gets the permissions of the target, and its group where the system allows it; those of a new file where there
    /// is none.
    void takePermissions();
    /// Brings all to the disk and takes the target's place. Once.
    void publish();

    /// Whether a file of this name is what a writer of `target` (a name, without folder) makes or has left.
    static bool isOf(std::string_view name, std::string_view target);

private:
    bool make(const std::filesystem::path& name);
    bool lock();

    std::filesystem::path target_;
    std::filesystem::path shown_; ///< as the target was given
    std::filesystem::path name_;
    Descriptor file_;
};

} // namespace storage
