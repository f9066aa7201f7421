// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>

namespace viewer {

/// The text that nw_error() gives: cut where there is no room for more, so that it can be kept without memory.
void keepError(const char* text) noexcept;
const char* lastError() noexcept;

} // namespace viewer
