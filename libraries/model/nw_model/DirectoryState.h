// SPDX-License-Identifier: Apache-2.0
// neuralWarp model runtime: whether a model directory is still the one that was looked at.
#pragma once

#include <array>
#include <cstdint>
#include <filesystem>

namespace neuralWarp {

/// What tells one state of a model directory from the next: device, inode, size and time of the last change, in ns, of
/// each of its three files, and device and inode of the directory itself. A directory is exchanged, or written into,
/// while somebody reads it; two states that are equal are those of one directory which nobody has written in between.
/// A plain value.
class DirectoryState {
public:
    /// None: equal to nothing, not even to itself.
    DirectoryState() = default;

    /// The state of a directory at rest: one whose files nobody has changed for 20 ms, because a change that follows
    /// another within one tick of the file system's clock leaves no trace, and because the files of a model are copied
    /// one after the other. Waits for that, 100 ms at most; then there is none. Files that claim to come from the
    /// future are taken as they are. Never throws.
    ///
    /// Thread: any.
    static DirectoryState atRest(const std::filesystem::path& directory) noexcept;

    /// The directory is there, or gone, just as it was. False for no state.
    bool isStillThatOf(const std::filesystem::path& directory) const noexcept;

private:
    struct Entry {
        std::uint64_t device = 0, inode = 0, size = 0;
        std::int64_t seconds = 0, nanoseconds = 0;
        bool operator==(const Entry&) const = default;
    };
    using Entries = std::array<Entry, 4>; // the directory, and its three files; of one that is missing all is 0

    static Entries entriesOf(const std::filesystem::path& directory);
    static bool areAtRest(const Entries& entries);

    Entries entries_;
    bool isKnown_ = false;
};

} // namespace neuralWarp
