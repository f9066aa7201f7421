// SPDX-License-Identifier: Apache-2.0
// What files hold, in a short sum; read again only when size or time of change say so.
#pragma once

#include <cstdint>
#include <filesystem>
#include <map>
#include <string>

namespace quarn {

/// Sums of a folder's files and of others. Thread: one at a time.
class FileSums {
public:
    /// Of a file as it was seen last.
    struct Seen {
        std::string sum;
        std::uint64_t bytes = 0;
        std::int64_t changed = 0; ///< nanoseconds
    };

    /// Relative paths count from `folder`.
    explicit FileSums(std::filesystem::path folder)
        : folder_(std::move(folder)) {}

    /// Of a file, or of the names and files of a folder or of a pattern ("#"). Empty when there is nothing
    /// at the path. Throws storage::FileError for what cannot be read.
    std::string of(const std::filesystem::path& path);

    /// By path, as it was asked for; of files alone.
    std::map<std::string, Seen> seen;

private:
    std::string ofFile(const std::filesystem::path& path);

    std::filesystem::path folder_;
};

} // namespace quarn
