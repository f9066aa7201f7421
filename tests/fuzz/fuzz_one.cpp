// SPDX-License-Identifier: Apache-2.0
// The program of a target: NW_FUZZ_BODY, declared in NW_FUZZ_HEADER.
#include NW_FUZZ_HEADER

#include <cstdio>

// refused inputs print their line; the fuzzer reports on standard error
extern "C" int LLVMFuzzerInitialize(int*, char***) {
    return std::freopen("/dev/null", "w", stdout) ? 0 : 1;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    NW_FUZZ_BODY(data, size);
    return 0;
}
