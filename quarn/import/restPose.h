// SPDX-License-Identifier: Apache-2.0
// The rest pose of a character, and how the joints of a scene hold it.
#pragma once

#include "quarn/character/Character.h"

#include <cstddef>

namespace quarn {

/// Index of the joint of that name. Throws std::runtime_error, naming it and some that there are, when there is none.
std::size_t jointNamed(const Character& character, const std::string& name);

/// The world's transformation of every joint at rest.
std::vector<HMatrix> restWorlds(const Character& character);

/// What the attributes of a joint of the scene say: matrix = S * R * JO * T, with R the identity at rest.
struct JointRest {
    HVector scale{1.0, 1.0, 1.0};
    HQuaternion orient;
    HVector translate;
    double shear = 0.0; ///< largest shear of the file's transformation, which a joint cannot hold and is left out

    HMatrix matrix() const;
};

/// Splits a transformation. A mirrored one has an odd number of negative scales: those that are negative in `signs`, a
/// scale that the file gives the joint, where their number is odd, too; all three otherwise. Accordingly for one that
/// is not mirrored.
JointRest splitRest(const HMatrix& transform, const HVector& signs = {1.0, 1.0, 1.0});

/// Of all joints, with the signs that `animation` scales them with; null without one.
std::vector<JointRest> splitRests(const Character& character, const Animation* animation);

/// The world's transformations of the scene's joints at rest. They are those of restWorlds() where there is no shear.
std::vector<HMatrix> sceneWorlds(const Character& character, const std::vector<JointRest>& rests);

} // namespace quarn
