// SPDX-License-Identifier: Apache-2.0
#include "builtins/builtins.h"

#include "commands/CommandRegistry.h"

namespace OpenQuarn {

void registerBuiltins() {
    static const bool once = [] {
        CommandRegistry& registry = CommandRegistry::instance();
        addConnectionCommands(registry);
        addDuplicate(registry);
        addFileCommand(registry);
        addGetAttr(registry);
        addMeshInfo(registry);
        addNodeCommands(registry);
        addPluginCommands(registry);
        addSceneCommands(registry);
        addSetAttr(registry);
        addTextCommands(registry);
        addTryCommand(registry);
        return true;
    }();
    static_cast<void>(once);
}

} // namespace OpenQuarn
