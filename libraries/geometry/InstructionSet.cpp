// SPDX-License-Identifier: Apache-2.0
#include "quill/InstructionSet.h"

#include <algorithm>
#include <atomic>

namespace quill {
namespace {

std::atomic<InstructionSet>& limit() {
    static std::atomic<InstructionSet> most{InstructionSet::avx512};
    return most;
}

} // namespace

InstructionSet processorInstructionSet() {
#if defined(__x86_64__)
    static const InstructionSet has = [] {
        if (__builtin_cpu_supports("avx512f") && __builtin_cpu_supports("avx512vl"))
            return InstructionSet::avx512;
        if (__builtin_cpu_supports("avx2"))
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
