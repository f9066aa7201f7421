// SPDX-License-Identifier: Apache-2.0
// duplicate: another node with the same values.
#include "builtins/Builtin.h"
#include "builtins/builtins.h"
#include "builtins/names.h"
#include "graph/Graph.h"
#include "graph/evaluation.h"

namespace OpenQuarn {
namespace {

// a plug-in's object is the node's own: it is copied by the plug-in, everything else is shared
std::shared_ptr<Data> copyOf(const Node& node, const std::shared_ptr<Data>& data) {
    const auto plugin = std::dynamic_pointer_cast<PluginData>(data);
    if (!plugin || !plugin->value)
        return data;
    const std::shared_ptr<PluginData> made = createPluginData(plugin->type->id);
    const HStatus status = callPlugin(node, "copy of data", [&]() -> HStatus {
        made->value->copy(*plugin->value);
        return {};
    });
    if (status.error())
        throw std::runtime_error("the data of '" + node.name() +
                                 "' cannot be copied: " + status.errorString().asStdString());
    return made;
}

void copyValue(const Node& node, const Slot& from, Slot& to) {
    to.number = from.number;
    to.data = copyOf(node, from.data);
    for (std::size_t i = 0; i < from.children().size(); ++i)
        copyValue(node, *from.children()[i], *to.children()[i]);
    from.elements().forEach(
        [&](unsigned index, const std::shared_ptr<Slot>& element) { copyValue(node, *element, *to.elementAt(index)); });
}

void copyValues(const Node& from, const Node& to) {
    const std::vector<std::shared_ptr<Slot>> slots = from.data()->slots;
    for (std::size_t i = 0; i < slots.size(); ++i) {
        Slot& copy = *to.data()->slots[i];
        if (!slots[i]->field.computed)
            pull(slots[i]); // connected inputs give the value that they have now
        copy.reset();       // what postConstructor() set
        copyValue(from, *slots[i], copy);
        if (copy.field.computed)
            copy.markDirty();
    }
}

class Duplicate : public Builtin {
    HStatus run(const Arguments& args) override {
        Graph& graph = currentGraph();
        const std::shared_ptr<Node> node = nodeNamed(args.text(0));
        const std::string name = args.has("name") ? args.flagText("name") : node->name();
        const std::shared_ptr<Node> copy = graph.createNode(findNodeClass(node->type().id), name);
        try {
            copyValues(*node, *copy);
        } catch (...) {
            graph.deleteNode(*copy);
            throw;
        }
        give(copy->name());
        return {};
    }
};

} // namespace

void addDuplicate(CommandRegistry& registry) {
    addBuiltin<Duplicate>(registry, "duplicate", "Makes a node with the values of another, and gives its name.",
                          SyntaxBuilder().flag("n", "name", HSyntax::kString).arg());
}

} // namespace OpenQuarn
