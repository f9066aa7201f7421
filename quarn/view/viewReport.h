// SPDX-License-Identifier: Apache-2.0
// What `quarn view` answers.
#pragma once

#include "quarn/view/viewing.h"

#include <string>

namespace quarn {

/// Numbers are independent of the locale.
std::string viewText(const ViewResult& result, const ViewPlan& plan);
std::string viewJson(const ViewResult& result, const ViewPlan& plan);

} // namespace quarn
