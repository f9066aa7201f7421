// SPDX-License-Identifier: Apache-2.0
// What the words of commands name.
#pragma once

#include "graph/Node.h"
#include "openquarn/HPlug.h"

#include <memory>
#include <string>
#include <string_view>

namespace OpenQuarn {

/// Throws std::invalid_argument, naming it, when there is no such node.
std::shared_ptr<Node> nodeNamed(const std::string& name);

/// "node.attribute[index].child". Throws std::invalid_argument, saying what is wrong, when it names no plug.
HPlug plugNamed(const std::string& name);

/// True for the name of a plug, false for that of a node.
bool namesPlug(std::string_view name);

} // namespace OpenQuarn
