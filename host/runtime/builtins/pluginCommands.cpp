// SPDX-License-Identifier: Apache-2.0
// loadPlugin, unloadPlugin.
#include "builtins/Builtin.h"
#include "builtins/builtins.h"
#include "openquarn_app/Plugins.h"

namespace OpenQuarn {
namespace {

class LoadPlugin : public Builtin {
    HStatus run(const Arguments& args) override {
        if (args.isQuery())
            give(loadedPlugins());
        else
            give(loadPlugin(args.text(0)));
        return {};
    }
};

class UnloadPlugin : public Builtin {
    HStatus run(const Arguments& args) override {
        unloadPlugin(args.text(0));
        return {};
    }
};

} // namespace

void addPluginCommands(CommandRegistry& registry) {
    addBuiltin<LoadPlugin>(registry, "loadPlugin", "Loads a plug-in by the path of its file and gives its name.",
                           SyntaxBuilder().query().arg());
    addBuiltin<UnloadPlugin>(registry, "unloadPlugin", "Unloads a plug-in by its name.", SyntaxBuilder().arg());
}

} // namespace OpenQuarn
