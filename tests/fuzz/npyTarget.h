// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>

/// Reads the bytes as a point cache. Ends the process (abort) when a file that is accepted has a frame that cannot be
/// read, or when a header made for its shape says something else. True when it is accepted.
bool fuzzNpy(const std::uint8_t* data, std::size_t size);
