// SPDX-License-Identifier: Apache-2.0
// Parts of a report's page, HTML.
#pragma once

#include <string>

namespace quarn {

struct Report;
struct Row;

/// Error over frames and vertices, the histogram of distances, and losses where they are known.
std::string chartsOf(const Row& row);
/// What the row is about, and what its model was made with.
std::string factsOf(const Report& report, const Row& row);

} // namespace quarn
