// SPDX-License-Identifier: Apache-2.0
// A point cache FILE.npy while it is made: its frames lie in FILE.npy.part, and what is there when a run ends too early
// is gone on from by the next one.
#pragma once

#include "quarn/scene/RecordedRows.h"
#include "quarn/scene/Setup.h"
#include "storage/FolderLock.h"

#include <cstddef>
#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <vector>

namespace quarn {

struct Console;

/// Nothing that quarn did not make is ever removed. Errors are std::runtime_error with the sentence for the user.
/// Thread: one at a time.
class GrowingCache {
public:
    /// Locks FILE.npy.part, which it makes. `file` absolute; where it is a link, what it leads to. `setup` of what is
    /// written, and `replaces` whether frames of another one may be given up: throws otherwise, with the first
    /// difference, and when another process has the folder. The console outlives it.
    GrowingCache(const std::filesystem::path& file, Setup setup, std::size_t frames, bool replaces,
                 const Console& console);
    ~GrowingCache();
    GrowingCache(const GrowingCache&) = delete;
    GrowingCache& operator=(const GrowingCache&) = delete;

    /// Takes up the frames of an earlier run, and answers how many they are.
    std::size_t goOn();
    /// Gives them up, with a note that says why.
    void beginAgain(const std::string& why);
    /// The points of a frame that is there, as they were written.
    std::vector<float> points(std::size_t row) const;

    /// Adds a frame; all have as many vertices. The first one begins the file.
    void append(std::span<const float> xyz);
    /// After an error, or Ctrl-C: brings what there is to the disk, with a note; what has no frame goes.
    void keep();
    /// Puts the cache, which has all its frames, into its place. A record of a part of before goes before.
    void publish();

    const std::filesystem::path& file() const { return file_; }
    /// What the frames are of, with the number of vertices once that is known.
    const Setup& setup() const { return setup_; }

private:
    void open(std::size_t vertices);
    void requireOursOnly() const;
    void discard();

    const Console& console_;
    std::filesystem::path file_, part_;
    Setup setup_;
    std::size_t frames_;
    bool replaces_;
    std::vector<std::filesystem::path> madeFolders_;
    std::optional<storage::FolderLock> lock_;
    std::size_t vertices_ = 0;
    std::optional<RecordedRows> rows_;
};

} // namespace quarn
