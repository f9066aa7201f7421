// SPDX-License-Identifier: Apache-2.0
// Command scripts of any text.
#include "scriptTarget.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzzScript(data, size);
    return 0;
}
