// SPDX-License-Identifier: Apache-2.0
// createNode, deleteNode, rename, ls, listAttr.
#include "builtins/Builtin.h"
#include "builtins/builtins.h"
#include "builtins/names.h"
#include "commands/WordValues.h"
#include "graph/Graph.h"
#include "graph/plugName.h"

#include <algorithm>

namespace OpenQuarn {
namespace {

std::shared_ptr<const NodeClass> classNamed(const std::string& name) {
    std::shared_ptr<const NodeClass> type = findNodeClass(name);
    if (!type)
        throw std::invalid_argument("there is no node type " + inQuotes(name));
    return type;
}

class CreateNode : public Builtin {
    HStatus run(const Arguments& args) override {
        give(currentGraph().createNode(classNamed(args.text(0)), args.flagText("name"))->name());
        return {};
    }
};

class DeleteNode : public Builtin {
    HStatus run(const Arguments& args) override {
        std::vector<std::shared_ptr<Node>> nodes;
        nodes.reserve(args.objectCount());
        for (const std::string& name : args.objects())
            nodes.push_back(nodeNamed(name));
        for (const std::shared_ptr<Node>& node : nodes)
            if (node->isAlive()) // not named twice
                currentGraph().deleteNode(*node);
        return {};
    }
};

class Rename : public Builtin {
    HStatus run(const Arguments& args) override {
        const std::shared_ptr<Node> node = nodeNamed(args.text(0));
        currentGraph().renameNode(*node, args.text(1));
        give(node->name());
        return {};
    }
};

class Ls : public Builtin {
    HStatus run(const Arguments& args) override {
        const bool ofType = args.has("type");
        const std::shared_ptr<const NodeClass> type = ofType ? classNamed(args.flagText("type")) : nullptr;
        const std::vector<std::string> patterns = args.objects();
        std::vector<std::string> names;
        for (const std::shared_ptr<Node>& node : currentGraph().nodes())
            if ((!ofType || &node->type() == type.get()) && isWanted(node->name(), patterns))
                names.push_back(node->name());
        give(std::move(names));
        return {};
    }

    static bool isWanted(const std::string& name, const std::vector<std::string>& patterns) {
        return patterns.empty() || std::any_of(patterns.begin(), patterns.end(), [&](const std::string& pattern) {
                   return matchesPattern(name, pattern);
               });
    }
};

class ListAttr : public Builtin {
    HStatus run(const Arguments& args) override {
        const std::shared_ptr<Node> node = nodeNamed(args.text(0));
        std::vector<std::string> paths;
        for (const std::unique_ptr<Field>& field : node->type().fields())
            addPaths(*field, "", paths);
        give(std::move(paths));
        return {};
    }

    static void addPaths(const Field& field, const std::string& above, std::vector<std::string>& paths) {
        const std::string path = above + field.attribute->name;
        paths.push_back(path);
        for (const std::unique_ptr<Field>& child : field.children)
            addPaths(*child, path + ".", paths);
    }
};

} // namespace

void addNodeCommands(CommandRegistry& registry) {
    addBuiltin<CreateNode>(registry, "createNode", "Makes a node of a type and gives its name.",
                           SyntaxBuilder().flag("n", "name", HSyntax::kString).arg());
    addBuiltin<DeleteNode>(registry, "deleteNode", "Deletes nodes with their connections.", SyntaxBuilder().objects(1));
    addBuiltin<Rename>(registry, "rename", "Gives a node another name.", SyntaxBuilder().arg().arg());
    addBuiltin<Ls>(registry, "ls", "Lists the nodes, or those whose names fit a pattern with * and ?.",
                   SyntaxBuilder().flag("typ", "type", HSyntax::kString).objects(0));
    addBuiltin<ListAttr>(registry, "listAttr", "Lists the attributes of a node, children as parent.child.",
                         SyntaxBuilder().arg());
}

} // namespace OpenQuarn
