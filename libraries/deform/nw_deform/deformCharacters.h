// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "nw_deform/Deformer.h"

#include <span>

namespace neuralWarp {

/// One of many characters.
struct CharacterFrame {
    Deformer* deformer;
    Pose pose;
    float* out; ///< as Deformer::evaluate() takes it; overlaps nothing of another character
};

/// Computes one frame of each character, side by side on oneTBB's workers, to the bits of Deformer::evaluate().
///   isCancelled  asked in long smoothing, by several threads at once
/// Throws std::invalid_argument when a deformer is there twice, and before anything is computed. Of the exceptions of
/// characters, which leave the others alone, it throws the first one's; one of a wrong argument is preceded by the
/// character's number.
void deformCharacters(std::span<const CharacterFrame> characters, const IsCancelled& isCancelled = {});

} // namespace neuralWarp
