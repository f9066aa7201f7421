// SPDX-License-Identifier: Apache-2.0
// Point caches of any bytes.
#include "npyTarget.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzzNpy(data, size);
    return 0;
}
