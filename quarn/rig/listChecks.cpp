// SPDX-License-Identifier: Apache-2.0
#include "rig/listChecks.h"

#include "rig/texts.h"

#include <cmath>

namespace rig {

HStatus wrong(const std::string& what) {
    return {HStatus::kFailure, what};
}

bool isIndex(double value) {
    return value >= 0.0 && value <= largestIndex && value == std::floor(value);
}

HStatus checkIndices(const char* list, const std::vector<double>& values) {
    for (std::size_t i = 0; i < values.size(); ++i)
        if (!isIndex(values[i]))
            return wrong(element(list, i) + " is " + text(values[i]) + ", not a whole number from 0 to 4294967295");
    return HStatus::kSuccess;
}

HStatus checkFinite(const char* list, const std::vector<double>& values) {
    for (std::size_t i = 0; i < values.size(); ++i)
        if (!std::isfinite(values[i]))
            return wrong(element(list, i) + " is " + text(values[i]));
    return HStatus::kSuccess;
}

} // namespace rig
