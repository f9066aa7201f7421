// SPDX-License-Identifier: Apache-2.0
// file: the scene and its file.
#include "builtins/Builtin.h"
#include "builtins/builtins.h"
#include "graph/Graph.h"
#include "openquarn_app/SceneFile.h"
#include "services/SceneFileState.h"

namespace OpenQuarn {
namespace {

constexpr double firstFrame = 1.0;

class File : public Builtin {
    HStatus run(const Arguments& args) override {
        if (args.isQuery()) {
            give(currentFile());
            return {};
        }
        int asked = 0;
        for (const char* flag : {"new", "open", "save", "saveAs"})
            asked += args.has(flag) ? 1 : 0;
        if (asked != 1)
            throw std::invalid_argument("one of -new, -open, -save and -saveAs is needed, and " +
                                        std::to_string(asked) + " are given");
        perform(args);
        return {};
    }

    static void perform(const Arguments& args) {
        if (args.has("new"))
            startAnew();
        else if (args.has("open"))
            must(openScene(args.flagText("open")));
        else if (args.has("saveAs"))
            must(saveScene(args.flagText("saveAs")));
        else if (currentFile().empty())
            throw std::invalid_argument("the scene has no file yet: use -saveAs with a path");
        else
            must(saveScene(currentFile()));
    }

    static void startAnew() {
        currentGraph().clear(firstFrame);
        setCurrentSceneFile({});
    }

    static void must(const FileOutcome& outcome) {
        if (!outcome.ok)
            throw std::runtime_error(outcome.error);
        give(currentFile());
    }
};

} // namespace

void addFileCommand(CommandRegistry& registry) {
    addBuiltin<File>(registry, "file", "Starts a new scene, opens one or saves it.",
                     SyntaxBuilder()
                         .query()
                         .flag("new", "new")
                         .flag("o", "open", HSyntax::kString)
                         .flag("s", "save")
                         .flag("sa", "saveAs", HSyntax::kString)
                         .flag("sn", "sceneName"));
}

} // namespace OpenQuarn
