// SPDX-License-Identifier: Apache-2.0
// A part of a data set, read as far as it takes to merge it.
#pragma once

#include "quarn/dataset/DatasetWriter.h"
#include "quarn/scene/PartRecord.h"
#include "storage/Json.h"

#include <filesystem>
#include <optional>

namespace quarn {

/// A complete data set. What is wrong with it is thrown as std::runtime_error that names the folder or the file.
/// Thread: any, one at a time.
class DatasetPart {
public:
    /// Reads its texts. Throws when the folder holds no complete data set.
    explicit DatasetPart(const std::filesystem::path& folder);

    const std::filesystem::path& folder() const { return folder_; }
    const Setup& setup() const { return setup_; }
    const storage::JsonDocument& description() const { return description_; }
    const std::optional<PartRecord>& record() const { return record_; }
    /// That it says its rows are of.
    FrameRange frames() const;
    const DatasetShape& shape() const { return shape_; }

    /// Throws unless its arrays are whole, of its shape and of its frames, and its record is one of this set-up and of
    /// these rows. Reads heads, frames.npy and a row.
    void check() const;

private:
    void requireArray(const char* file, const char* type, const std::vector<std::uint64_t>& shape) const;
    void requireFrames() const;

    std::filesystem::path folder_;
    Setup setup_;
    storage::JsonDocument description_;
    std::optional<PartRecord> record_;
    DatasetShape shape_;
};

} // namespace quarn
