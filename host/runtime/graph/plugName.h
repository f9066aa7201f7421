// SPDX-License-Identifier: Apache-2.0
// Plugs by name.
#pragma once

#include "graph/Graph.h"
#include "openquarn/HPlug.h"

#include <string>

namespace OpenQuarn {

/// The plug that "attribute[index].child" names on a node: long or short names, elements that need not exist. Throws
/// std::invalid_argument naming what is wrong with the text.
HPlug plugNamed(const std::shared_ptr<Node>& node, const std::string& path);
/// The same for "node.attribute…".
HPlug plugNamed(const Graph& graph, const std::string& name);
/// True when the text matches a pattern of literal letters, "*" for any run and "?" for any one character.
bool matchesPattern(const std::string& text, const std::string& pattern);

} // namespace OpenQuarn
