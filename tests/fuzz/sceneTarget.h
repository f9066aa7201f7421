// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>

/// Reads the bytes as a scene file. Ends the process (abort) when a file that is refused has changed the scene, or when
/// one that is accepted is not read again, and written as the same text, after it was written once. Then evaluates
/// every output that there is; the scene has to be one that can be written, again. True when the file is accepted.
bool fuzzScene(const std::uint8_t* data, std::size_t size);
/// The same in a session where `registerTypes` has registered further types of nodes.
bool fuzzSceneWith(const std::uint8_t* data, std::size_t size, void (*registerTypes)());
