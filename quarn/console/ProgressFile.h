// SPDX-License-Identifier: Apache-2.0
// How far a work is, in a file, for programs that look on.
#pragma once

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <string>

namespace quarn {

/// JSON: "what" is done, "done" of "total", "seconds" since its begin, and "secondsLeft", null before anything is done.
/// Written anew as a whole, twice a second at most. Thread: one at a time.
class ProgressFile {
public:
    using Clock = std::chrono::steady_clock;

    /// With an empty path nothing is written. `total` above 0. Throws storage::FileError for a file that cannot be
    /// written; one that cannot be written later on is nothing that a work should end for.
    ProgressFile(std::filesystem::path path, std::string what, std::size_t total);

    /// `done` of them are done.
    void count(std::size_t done);

private:
    void write(std::size_t done);

    std::filesystem::path path_;
    std::string what_;
    std::size_t total_;
    Clock::time_point begin_, written_;
};

} // namespace quarn
