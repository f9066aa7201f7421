// SPDX-License-Identifier: Apache-2.0
// dataset.json of a data set that was merged.
#pragma once

#include "quarn/dataset/DatasetPart.h"
#include "quarn/dataset/controlRanges.h"
#include "quarn/scene/frames.h"

#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// What the descriptions of parts say, as far as it is not of each: added part by part, in order. Thread: one at a
/// time.
class MergedDescription {
public:
    /// `ofWhole`: each part says of the target and of drawn poses what is true of the whole.
    explicit MergedDescription(bool ofWhole)
        : ofWhole_(ofWhole) {}

    /// Throws std::runtime_error, naming both folders and the key, when the part says other things than the first.
    void add(DatasetPart part);
    /// The text, of so many rows and these ranges.
    std::string text(std::size_t rows, const std::vector<ControlRange>& ranges) const;
    /// Parts agree in how far the target is from the skin. They need not on processors of different kinds.
    bool agreesInFit() const { return agreesInFit_; }

private:
    void addFit(const storage::JsonDocument& description);
    void addDrawn(const storage::JsonDocument& description, int step);

    bool ofWhole_;
    bool agreesInFit_ = true;
    std::optional<DatasetPart> first_;
    storage::JsonDocument fit_;              ///< null: none
    std::vector<std::pair<int, int>> drawn_; ///< spans of frames
};

} // namespace quarn
