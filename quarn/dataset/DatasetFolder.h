// SPDX-License-Identifier: Apache-2.0
// Where a training data set goes: FOLDER when it is complete, and FOLDER.part until then.
#pragma once

#include "quarn/scene/Setup.h"
#include "quarn/scene/goOn.h"

#include <cstdint>
#include <filesystem>
#include <string>

namespace storage {
class FolderLock;
}

namespace quarn {

/// Nothing that quarn did not make is ever removed. Errors are std::runtime_error with the sentence for the user.
/// Thread: one at a time.
class DatasetFolder {
public:
    /// `folder` absolute; where it is a link, what it leads to. `replaces` says whether a complete data set of another
    /// set-up may be replaced by the new one, and a begun one given up.
    DatasetFolder(const std::filesystem::path& folder, bool replaces);

    const std::filesystem::path& path() const { return folder_; }
    const std::filesystem::path& part() const { return part_; }

    /// True when FOLDER is a complete data set of this set-up, and is to stay. Throws when something else is there that
    /// is to stay: another data set without `replaces`, or no data set.
    bool isDone(const Setup& setup) const;

    /// Whether FOLDER.part was begun with this set-up. Throws when it was begun with another, without `replaces`.
    Begun begun(const Setup& setup) const;
    /// Removes what was begun.
    void discard() const;
    /// The same, and writes the set-up.
    void begin(const Setup& setup) const;

    /// Throws, with both numbers, unless the disk has room for so many bytes.
    void requireSpace(std::uint64_t bytes) const;
    /// Puts what is in FOLDER.part, and complete, into its place. A data set that is there goes when the new one has
    /// come.
    void publish(storage::FolderLock& lock) const;

private:
    void requireOursOnly(const std::filesystem::path& folder) const;

    std::filesystem::path folder_;
    std::filesystem::path part_;
    bool replaces_;
};

/// Who has a folder that is locked, for storage::FolderLock.
inline constexpr const char* anotherExport = "another quarn export";

inline constexpr const char* descriptionFile = "dataset.json";

/// Of the files of a complete data set, together.
std::uintmax_t bytesOfDataset(const std::filesystem::path& folder);

} // namespace quarn
