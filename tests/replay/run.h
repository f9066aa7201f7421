// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "compare.h"
#include "kinds.h"

#include <optional>

namespace replay {

// The kind of that name, or null.
const Kind* findKind(std::string_view name);

// Runs a case through its kind's code and lists every disagreement: values, keys of the expected result that nothing
// was compared with, members of the input that nothing read, and an exception as one.
std::vector<Disagreement> replayCase(const Kind& kind, const Case& testCase, double tolerance);

} // namespace replay
