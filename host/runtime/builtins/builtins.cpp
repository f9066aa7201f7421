// SPDX-License-Identifier: Apache-2.0
#include "builtins/builtins.h"

#include "commands/CommandRegistry.h"

namespace OpenQuarn {
namespace {

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

// when the library is loaded: commands work before the first session, too
[[maybe_unused]] const bool brought = CommandRegistry::bringOwn(addBuiltins);

} // namespace
} // namespace OpenQuarn
