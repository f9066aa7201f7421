// SPDX-License-Identifier: Apache-2.0
// What is said of poses that models do not know.
#pragma once

#include "quarn/console/json.h"
#include "quarn/scene/PoseWatch.h"

#include <string>
#include <vector>

namespace quarn {

struct Console;

/// Lines for a person, each with its end; of many controls the first ten. Empty without reports.
std::string posesText(const std::vector<PoseReport>& reports);

/// The same as a note, for a command whose answer is something else.
void notePoses(const Console& console, const std::vector<PoseReport>& reports);

/// "poses": a list with one object a report, as docs/play.md shows it.
void writePoses(JsonWriter& json, const std::vector<PoseReport>& reports);

} // namespace quarn
