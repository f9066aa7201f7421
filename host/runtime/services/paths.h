// SPDX-License-Identifier: Apache-2.0
// Paths as texts: what HFileObject is made of. Thread: any.
#pragma once

#include <string>
#include <string_view>

namespace OpenQuarn {

/// `path` with a leading "~" and all $NAME and ${NAME} replaced from the environment; what is not set stays.
std::string expandPath(std::string_view path);

/// Head and tail with one separator between them; the tail alone when the head is empty.
std::string joinPath(std::string_view head, std::string_view tail);

/// May be in the name of a variable.
bool isNameCharacter(char c);

bool isAbsolutePath(std::string_view path);

/// True when an entry of any kind exists there; false for an empty path, and when the disk cannot answer.
bool pathExists(const std::string& path);

} // namespace OpenQuarn
