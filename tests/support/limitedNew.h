// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>

// A program that is linked with limitedNew.cpp has an operator new that throws when malloc has nothing, or when more is
// asked for than this allows. (The address sanitizer's own would end the process.)

/// Smallest size in bytes that is refused; SIZE_MAX at first. Not for several threads at once.
extern std::size_t refusedAllocation;
