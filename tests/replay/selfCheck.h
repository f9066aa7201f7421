// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "run.h"

#include <string>
#include <vector>

namespace replay {

// What a check of the checker found out about one kind of case.
struct SelfCheckResult {
    std::size_t perturbed = 0;            // keys of which one value was changed
    std::vector<std::string> unnoticed;   // changed, but the comparison did not report it
    std::vector<std::string> unperturbed; // keys that hold no value to change in any case
};

// For every key of the expected results of a kind (members of members counted apart, elements of a list together),
// changes one value in one case (an integer by 1, a number by a thousandth, a text by an "x", a truth value to the
// other; a list that is empty in every case gets an element) and asks the comparison, at the case's own tolerance,
// whether it notices there.
SelfCheckResult selfCheck(const Kind& kind, const std::vector<Case*>& cases);

} // namespace replay
