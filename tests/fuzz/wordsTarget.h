// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>

/// Takes each line as a word. After a first line "args" they are the arguments of a command that has flags of every
/// kind; otherwise each is the name of a plug. Ends the process (abort) when an argument that was accepted is not of
/// the kind that was asked for, or when a plug is not found again, as itself, by the name that it says. True when
/// everything was accepted.
bool fuzzWords(const std::uint8_t* data, std::size_t size);
