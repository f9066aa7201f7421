// SPDX-License-Identifier: Apache-2.0
// What a report is asked for: a row for each scene, from the words of the command line.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// How much may be left.
struct Limit {
    double value = 0.0;         ///< of 0 or above
    bool isMillimetres = false; ///< else a part of what there is without the network
    std::string text() const;   ///< "6.25 %", "0.5 mm"
};

/// "0.0625", "6.25%" or "0.5mm". Throws UsageError, quoting the text.
Limit limitOf(const std::string& text);

struct RowRequest {
    std::string name; ///< what the row is called; no other row's
    std::filesystem::path scene;
    std::string deformer, geometry, model, frames; ///< as flags of quarn play; empty: not given
    std::filesystem::path training, evaluation;    ///< the trainer's report folder, and what `trainer evaluate` said
    std::optional<Limit> mean, max;
};

/// Flags of which each word is VALUE, for all rows, or NAME=VALUE, for one. What stands before a "=" is a name when it
/// has no "/" in it.
struct RowWords {
    std::vector<std::string> scenes; ///< [NAME=]SCENE, one or more; without a name it has that of its file
    std::vector<std::string> deformers, geometries, models, frames, trainings, evaluations, means, maxima;
};

/// Throws UsageError for two rows of one name, a NAME that is no row's, two values for one row, and files that are
/// given for all of several rows.
std::vector<RowRequest> rowsOf(const RowWords& words);

} // namespace quarn
