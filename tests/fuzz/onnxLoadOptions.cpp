// SPDX-License-Identifier: Apache-2.0
// The sanitizers' options for the target that loads a network file, and runs it on zeros when it loads.
//
// ONNX Runtime is not instrumented. The fuzzer therefore sees no coverage inside it and mutates all but blindly there,
// and the sanitizers check only our code and the memory that passes through malloc. What this target shows is that no
// outcome of the runtime breaks a promise of ModelSession. It needs no flags; -close_fd_mask=2 hides the runtime's own
// warnings.

// A model may ask for any amount of memory. malloc then returns null, as it would without a sanitizer, well below the
// fuzzer's own limit; and operator new throws (support/watchedNew.cpp).
extern "C" const char* __asan_default_options() {
    return "allocator_may_return_null=1:max_allocation_size_mb=512";
}

// What the runtime keeps for the life of the process is its own business.
extern "C" const char* __lsan_default_suppressions() {
    return "leak:libonnxruntime.so\n";
}
