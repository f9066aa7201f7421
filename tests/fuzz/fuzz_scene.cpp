// SPDX-License-Identifier: Apache-2.0
// Scene files of any bytes.
#include "sceneTarget.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzzScene(data, size);
    return 0;
}
