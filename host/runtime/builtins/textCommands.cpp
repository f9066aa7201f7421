// SPDX-License-Identifier: Apache-2.0
// print and help.
#include "builtins/Builtin.h"
#include "builtins/builtins.h"
#include "commands/WordValues.h"
#include "openquarn_app/Messages.h"

namespace OpenQuarn {
namespace {

class Print : public Builtin {
    HStatus run(const Arguments& args) override {
        std::string line;
        for (std::size_t i = 0; i < args.objectCount(); ++i)
            line += (i > 0 ? " " : "") + args.object(i);
        showMessage(Severity::info, line);
        return {};
    }
};

std::string usage(const CommandType& type) {
    const std::string shape = type.syntax ? describeSyntax(*Access::impl(*type.syntax)) : "[...]";
    return type.name + (shape.empty() ? "" : " ") + shape + (type.summary.empty() ? "" : "\n    " + type.summary);
}

class Help : public Builtin {
    HStatus run(const Arguments& args) override {
        const CommandRegistry& registry = CommandRegistry::instance();
        if (args.objectCount() == 0) {
            give(registry.names());
            return {};
        }
        const std::string& name = args.object(0);
        const auto type = registry.find(name);
        if (!type)
            return {HStatus::kNotFound, "there is no command " + inQuotes(name)};
        give(usage(*type));
        return {};
    }
};

} // namespace

void addTextCommands(CommandRegistry& registry) {
    addBuiltin<Print>(registry, "print", "Shows its words as a message.", SyntaxBuilder().objects(0));
    addBuiltin<Help>(registry, "help", "Lists the commands, or shows how one is written.",
                     SyntaxBuilder().objects(0, 1));
}

} // namespace OpenQuarn
