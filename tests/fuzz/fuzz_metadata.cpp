// SPDX-License-Identifier: Apache-2.0
// "metadata.json" from memory.
#include "modelTargets.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    silenceStandardOutput();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzzMetadata(data, size);
    return 0;
}
