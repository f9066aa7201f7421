// SPDX-License-Identifier: Apache-2.0
// Which weights of morph targets drive a deformer, and how far they go.
#pragma once

#include "quarn/import/characterScene.h"
#include "quarn/import/jsonFiles.h"

#include <string>
#include <vector>

namespace quarn {

struct PosedSlider {
    std::size_t mesh = 0;   ///< index into Character::meshes
    std::size_t target = 0; ///< index into its morphTargets, and of the slider
    std::string name;       ///< of the slider in the scene
    ValueRange limits;
};

struct PosedSliders {
    std::vector<PosedSlider> sliders; ///< by rising mesh and target
    std::vector<std::string> notes;   ///< where limits come from; which were left out, and why

    /// Whether one of them is of that mesh.
    bool isOf(std::size_t mesh) const;
};

/// The weights that a deformer has to know of: all of targets that move a vertex, from 0 to 1 and as far as their rest
/// and the animations go beyond that; or those of `limits`, which are the user's and may be null. Throws
/// std::runtime_error, naming it, for a slider of these that there is not. Thread: main.
PosedSliders choosePosedSliders(const Character& character, const CharacterScene& scene, const SliderLimitMap* limits,
                                const std::vector<const Animation*>& animations);

/// Whether one of the animations changes a weight.
bool moveWeights(const std::vector<const Animation*>& animations);

} // namespace quarn
