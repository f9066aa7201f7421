// SPDX-License-Identifier: Apache-2.0
// Which quarn this is, to the commit, and what it uses of the processor: results of different ones are held apart.
#pragma once

#include <string>

namespace quarn {

/// What the program was built from: of a source that the build writes, which only the program itself is linked with.
extern const char* const commit;

/// 12 digits of the commit that the program was built from, with a "+" behind them when the tree was changed; "unknown"
/// where there was no history, and in what is no quarn but uses its libraries. Thread: any.
std::string buildId();
/// What buildId() answers from now on; main() says it first. Thread: main, while there is no other.
void setBuildId(const std::string& id);

/// What loops use of this processor: "scalar", "AVX", "AVX2" or "AVX-512". Thread: any.
std::string instructionSet();

} // namespace quarn
