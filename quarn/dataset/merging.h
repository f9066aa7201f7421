// SPDX-License-Identifier: Apache-2.0
// Parts of a data set, or of a point cache, become the whole.
#pragma once

#include "quarn/console/Console.h"

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <set>
#include <string>
#include <vector>

namespace quarn {

/// What `quarn merge` is told by its flags.
struct MergeOptions {
    std::vector<std::filesystem::path> parts; ///< at least one, in any order where they have records
    std::filesystem::path output;
    bool overwrite = false;
    Console console;
};

struct MergeAnswer {
    std::filesystem::path output;
    std::size_t rows = 0;
    std::uintmax_t bytes = 0;              ///< as an export of all has it
    bool wasComplete = false;              ///< and nothing was written
    std::set<std::string> instructionSets; ///< that parts were made with; empty where they have no records
};

/// Joins parts that `quarn export --of` has made, folders, into a complete data set, to the byte that of one export of
/// all frames on a processor of the same kind; without their records, parts whose frames follow each other. Throws
/// std::runtime_error, before anything is written, when the parts are not all frames once, were made from different
/// things or by different builds, do not fit where one ends and the next begins, or are damaged; and when `output`
/// holds anything else. Whatever ends it leaves `output` as it was. Memory: a block and one part's dataset.json.
/// Thread: main.
MergeAnswer mergeDatasets(const MergeOptions& options);

/// The same of .npy caches, which become one file. Those without records are joined in the order in which they are
/// given.
MergeAnswer mergeCaches(const MergeOptions& options);

} // namespace quarn
