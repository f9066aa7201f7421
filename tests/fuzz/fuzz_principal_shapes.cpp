// SPDX-License-Identifier: Apache-2.0
// "principal_shapes.json" from memory.
#include "modelTargets.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    silenceStandardOutput();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzzPrincipalShapes(data, size);
    return 0;
}
