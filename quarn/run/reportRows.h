// SPDX-License-Identifier: Apache-2.0
// What the report of a run is about: the file that `trainer report` reads.
#pragma once

#include "quarn/run/RunFacts.h"
#include "quarn/run/RunSettings.h"

namespace quarn {

struct ReportRows {
    std::string title;
    bool isMotion = false; ///< what is held out is a motion; else poses that have nothing to do with each other
    int firstFrame = 0;    ///< of it
    Words meshes;
    /// A still, and what is said below it.
    struct Picture {
        std::filesystem::path file;
        std::string caption;
    };
    std::vector<Picture> pictures;
    std::vector<std::filesystem::path> preview; ///< frames of the moving one
};

/// JSON, version 1; names of files count from the run's folder. docs/run.md describes it.
std::string textOf(const ReportRows& rows);

} // namespace quarn
