// SPDX-License-Identifier: Apache-2.0
// workspace, currentTime, dgdirty.
#include "builtins/Builtin.h"
#include "builtins/builtins.h"
#include "builtins/names.h"
#include "commands/WordValues.h"
#include "graph/Graph.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Workspace.h"

#include <filesystem>

namespace OpenQuarn {
namespace {

class WorkspaceCommand : public Builtin {
    HStatus run(const Arguments& args) override {
        if (args.isQuery() ? !args.has("rootDirectory") : args.has("rootDirectory") == args.has("openWorkspace"))
            throw std::invalid_argument("nothing is asked for: give -rootDirectory, with -query or a path, or "
                                        "-openWorkspace with the path of a folder");
        if (args.isQuery())
            give(Workspace::rootDirectory());
        else if (args.has("rootDirectory"))
            Workspace::setRootDirectory(args.flagText("rootDirectory"));
        else
            open(args.flagText("openWorkspace"));
        return {};
    }

    // paths are made by appending to the root, which ends in "/" therefore
    static void open(const std::string& path) {
        const std::filesystem::path folder = Workspace::callersPath(path);
        std::error_code error;
        if (!std::filesystem::is_directory(folder, error))
            throw std::invalid_argument("there is no folder " + inQuotes(path));
        Workspace::setRootDirectory((std::filesystem::absolute(folder) / "").lexically_normal().string());
    }
};

class CurrentTime : public Builtin {
    HStatus run(const Arguments& args) override {
        Graph& graph = currentGraph();
        if (!args.isQuery() && args.objectCount() > 0)
            graph.setTime(frame(args.object(0)));
        give(graph.time());
        return {};
    }

    static double frame(const std::string& word) {
        double value = 0;
        if (const HStatus status = readWord(word, value); status.error())
            throw std::invalid_argument(status.errorString().asStdString());
        return value;
    }
};

class DgDirty : public Builtin {
    HStatus run(const Arguments& args) override {
        const std::string& name = args.text(0);
        return namesPlug(name) ? makeDirty(plugNamed(name)) : makeDirty(Access::object(nodeNamed(name)));
    }
};

} // namespace

void addSceneCommands(CommandRegistry& registry) {
    addBuiltin<WorkspaceCommand>(registry, "workspace", "Gives or sets the folder that the user works in.",
                                 SyntaxBuilder()
                                     .query()
                                     .flag("rd", "rootDirectory", HSyntax::kString)
                                     .flag("o", "openWorkspace", HSyntax::kString));
    addBuiltin<CurrentTime>(registry, "currentTime", "Gives the current time in frames, or sets it.",
                            SyntaxBuilder().query().objects(0, 1));
    addBuiltin<DgDirty>(registry, "dgdirty", "Has the outputs of a node, or a plug, evaluated again when asked for.",
                        SyntaxBuilder().arg());
}

} // namespace OpenQuarn
