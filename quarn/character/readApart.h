// SPDX-License-Identifier: Apache-2.0
// Reading foreign files at a safe distance: the importer does not check all that it is given.
#pragma once

#include <functional>
#include <string>

namespace quarn {

/// The ending of a path in small letters, with its dot.
std::string lowerEnding(const std::string& path);
/// Of ".gltf" and ".glb".
bool isGltf(const std::string& ending);

/// The bytes of a character file. Throws std::runtime_error with the reason alone; an empty file is one.
std::string readCharacterBytes(const std::string& path);

/// What `action` gives in a process of its own: see runApart(). Throws std::runtime_error with the reason.
std::string importApart(const std::function<std::string()>& action);

} // namespace quarn
