// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>

/// Reads the bytes behind the first as a point cache: 'p' PC2, 'm' MDD, 'z' NPZ. Ends the process (abort) when a file
/// that is accepted has a frame or a time that cannot be read. True when it is accepted.
bool fuzzCache(const std::uint8_t* data, std::size_t size);
