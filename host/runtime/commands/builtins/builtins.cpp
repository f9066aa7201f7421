// SPDX-License-Identifier: Apache-2.0
#include "commands/builtins/builtins.h"

namespace OpenQuarn {

void addBuiltins(CommandRegistry& registry) {
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
}

} // namespace OpenQuarn
