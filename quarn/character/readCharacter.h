// SPDX-License-Identifier: Apache-2.0
// Reading rigged characters from glTF 2, FBX and Collada files. docs/characters.md says what is read.
#pragma once

#include "quarn/character/Character.h"

#include <string>

namespace quarn {

/// Reads a character. `path` names a .gltf, .glb, .fbx or .dae file; the case of the ending does not matter. Every
/// size, index and number of the file is checked. Throws std::runtime_error, "PATH: reason", when the file cannot be
/// read, is damaged or holds no mesh; what can be read in spite of an oddity becomes a warning of the character. One
/// thread at a time: the importer has one log.
Character readCharacter(const std::string& path);

/// One line a mesh, with the counts before and after the joining of vertices, then joints, animations and warnings.
std::string describeCharacter(const Character& character);

} // namespace quarn
