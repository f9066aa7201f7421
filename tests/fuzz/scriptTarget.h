// SPDX-License-Identifier: Apache-2.0
// What the fuzz target of command scripts does with one input. Apart from the target, so that a unit test can run the
// seed corpus through the same code.
#pragma once

#include <cstddef>
#include <cstdint>

/// Splits the text, quotes every word and splits again. Ends the process (abort) when the words are others then, or a
/// command has none, or a line number is not in the text. Returns true when the text is a well-formed script.
bool fuzzScript(const std::uint8_t* data, std::size_t size);
