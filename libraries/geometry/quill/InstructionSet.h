// SPDX-License-Identifier: Apache-2.0
#pragma once

namespace quill {

/// What loops may use of a processor, each beside all before it. Results have the same bits with any of them.
enum class InstructionSet {
    plain, ///< what every processor of the architecture has
    avx,
    avx2,   ///< AVX2 and F16C
    avx512, ///< AVX-512F and AVX-512VL
};

/// The largest that this processor has. [any]
InstructionSet processorInstructionSet();

/// What loops use: the processor's, unless it is limited. [any]
InstructionSet instructionSet();

/// For tests and measurements: loops that begin from now on use no larger one. [any]
void limitInstructionSet(InstructionSet most);

} // namespace quill
