// SPDX-License-Identifier: Apache-2.0
// The program of a target that needs nothing but its body: NW_FUZZ_BODY, declared in NW_FUZZ_HEADER.
#include NW_FUZZ_HEADER

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    NW_FUZZ_BODY(data, size);
    return 0;
}
