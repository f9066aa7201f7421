// SPDX-License-Identifier: Apache-2.0
// The host's own commands, by subject, each in a file of its own. docs/commands.md describes them.
#pragma once

namespace OpenQuarn {

class CommandRegistry;

void addConnectionCommands(CommandRegistry& registry);
void addDuplicate(CommandRegistry& registry);
void addFileCommand(CommandRegistry& registry);
void addGetAttr(CommandRegistry& registry);
void addMeshInfo(CommandRegistry& registry);
void addNodeCommands(CommandRegistry& registry);
void addPluginCommands(CommandRegistry& registry);
void addSceneCommands(CommandRegistry& registry);
void addSetAttr(CommandRegistry& registry);
void addTextCommands(CommandRegistry& registry);
void addTryCommand(CommandRegistry& registry);

} // namespace OpenQuarn
