// SPDX-License-Identifier: Apache-2.0
#include "builtins/names.h"

#include "commands/WordValues.h"
#include "graph/Graph.h"
#include "graph/plugName.h"

#include <stdexcept>

namespace OpenQuarn {

std::shared_ptr<Node> nodeNamed(const std::string& name) {
    std::shared_ptr<Node> node = currentGraph().find(name);
    if (!node)
        throw std::invalid_argument("there is no node " + inQuotes(name));
    return node;
}

HPlug plugNamed(const std::string& name) {
    return plugNamed(currentGraph(), name);
}

bool namesPlug(std::string_view name) {
    return name.find('.') != std::string_view::npos;
}

} // namespace OpenQuarn
