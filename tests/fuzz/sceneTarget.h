// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>

/// Reads the bytes as a scene file. Ends the process (abort) when a file that is refused has changed the scene, or when
/// one that is accepted is not read again, and written as the same text, after it was written once. True when it is
/// accepted.
bool fuzzScene(const std::uint8_t* data, std::size_t size);
