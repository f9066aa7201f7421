// SPDX-License-Identifier: Apache-2.0
#include "quill/InstructionSet.h"

#include <algorithm>
#include <atomic>

#if defined(__x86_64__)
#include <cpuid.h>
#endif

namespace quill {
namespace {

#if defined(__x86_64__)
// every processor with AVX2 converts halves, but a virtual machine may hide that; clang 14 has no name for it
bool convertsHalves() {
    unsigned a = 0, b = 0, c = 0, d = 0;
    return __get_cpuid(1, &a, &b, &c, &d) != 0 && (c & bit_F16C) != 0;
}
#endif

std::atomic<InstructionSet>& limit() {
    static std::atomic<InstructionSet> most{InstructionSet::avx512};
    return most;
}

} // namespace

InstructionSet processorInstructionSet() {
#if defined(__x86_64__)
    static const InstructionSet has = [] {
        const bool hasAvx2 = __builtin_cpu_supports("avx2") && convertsHalves();
        if (hasAvx2 && __builtin_cpu_supports("avx512f") && __builtin_cpu_supports("avx512vl"))
            return InstructionSet::avx512;
        if (hasAvx2)
            return InstructionSet::avx2;
        return __builtin_cpu_supports("avx") ? InstructionSet::avx : InstructionSet::plain;
    }();
    return has;
#else
    return InstructionSet::plain;
#endif
}

InstructionSet instructionSet() {
    return std::min(processorInstructionSet(), limit().load(std::memory_order_relaxed));
}

void limitInstructionSet(InstructionSet most) {
    limit().store(most, std::memory_order_relaxed);
}

} // namespace quill
