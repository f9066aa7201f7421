// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace storage {

/// Tells a file from another in its place, or from itself after it was written again.
struct FileIdentity {
    std::uint64_t device = 0;
    std::uint64_t inode = 0;
    std::uint64_t size = 0;
    std::int64_t seconds = 0; ///< of the last change, with the nanoseconds
    std::int64_t nanoseconds = 0;
    bool operator==(const FileIdentity&) const = default;
};

/// Of what is at `path` now; none when nothing is, or it cannot be told. [any]
std::optional<FileIdentity> identityOf(const std::string& path);

/// Of an open regular file. Throws std::runtime_error, with the reason alone, for anything else. [any]
FileIdentity identityOf(int descriptor);

} // namespace storage
