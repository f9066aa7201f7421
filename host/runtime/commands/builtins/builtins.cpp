// SPDX-License-Identifier: Apache-2.0
#include "commands/builtins/builtins.h"

namespace OpenQuarn {

void addBuiltins(CommandRegistry& registry) {
    addTextCommands(registry);
}

} // namespace OpenQuarn
