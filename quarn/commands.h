// SPDX-License-Identifier: Apache-2.0
// What quarn does, one function a sub-command. All throw std::runtime_error with the sentence that the user reads.
#pragma once

#include <string>
#include <vector>

namespace quarn {

/// Loads the plug-ins, then runs the script. `file` a path, or "-" for standard input.
void execute(const std::vector<std::string>& plugins, const std::string& file);

/// Prints what is in a scene file, for people or as JSON.
void showInfo(const std::string& scene, bool json);

/// Loads the plug-ins, then prints the attributes of a node type, for people or as JSON.
void listAttributes(const std::vector<std::string>& plugins, const std::string& nodeType, bool json);

} // namespace quarn
