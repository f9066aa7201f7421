// SPDX-License-Identifier: Apache-2.0
// A report, complete: what its files say.
#pragma once

#include "quarn/report/Row.h"

namespace quarn {

struct Report {
    std::string title;
    bool isMotion = true; ///< frames follow each other; else poses that have nothing to do with each other
    std::string quarn;    ///< its version
    std::string processor;
    unsigned threads = 0; ///< of the machine
    std::vector<Row> rows;

    bool hasLimits() const;
    bool isKept() const; ///< all limits of all rows
};

/// "AMD EPYC 7B13"; "unknown" where the system does not say. Thread: any.
std::string processorName();

/// What a row's GPU stands for, for readers.
std::string gpuText(const Report& report);

/// The errors in mm, a line a row, and the times of a frame.
std::string tableOf(const Report& report);
/// report.json, version 2; docs/report.md describes it.
std::string jsonOf(const Report& report);
/// report.html: one file, whose pictures are in it.
std::string pageOf(const Report& report);

} // namespace quarn
