// SPDX-License-Identifier: Apache-2.0
// A network file: loaded, and run on zeros when it loads.
//
// ONNX Runtime is not instrumented. The fuzzer therefore sees no coverage inside it and mutates all but blindly there,
// and the sanitizers check only our code and the memory that passes through malloc. What this target shows is that no
// outcome of the runtime breaks a promise of ModelSession. It needs no flags; -close_fd_mask=2 hides the runtime's own
// warnings.
#include <cstdlib>
#include <new>

#include "modelTargets.h"

// A model may ask for any amount of memory. The sanitizer's malloc then returns null, and so must the fuzzer's limits
// stay out of the way (-malloc_limit_mb is met first otherwise); its operator new would end the process, so this
// program brings one that throws as the standard library's does.
extern "C" const char* __asan_default_options() {
    return "allocator_may_return_null=1:max_allocation_size_mb=1024";
}

// What the runtime keeps for the life of the process is its own business.
extern "C" const char* __lsan_default_suppressions() {
    return "leak:libonnxruntime.so\n";
}

void* operator new(std::size_t size) {
    void* block = std::malloc(size);
    if (block == nullptr) {
        throw std::bad_alloc();
    }
    return block;
}
void operator delete(void* block) noexcept {
    std::free(block);
}
void operator delete(void* block, std::size_t) noexcept {
    std::free(block);
}

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    silenceStandardOutput();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzzOnnxLoad(data, size);
    return 0;
}
