// SPDX-License-Identifier: Apache-2.0
// The one way in which this library says something.
#pragma once

#include <initializer_list>

namespace neuralWarp {

/// Prints parts of a line, the last of which ends it, on standard output, or leaves them to the CaughtLines of this
/// thread. Thread: any.
void printLine(const char* line) noexcept;
void printLine(std::initializer_list<const char*> parts) noexcept;

} // namespace neuralWarp
