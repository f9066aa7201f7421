// SPDX-License-Identifier: Apache-2.0
// connectAttr, disconnectAttr, listConnections.
#include "builtins/Builtin.h"
#include "builtins/builtins.h"
#include "builtins/names.h"
#include "graph/Graph.h"
#include "graph/plugImpl.h"

#include <set>

namespace OpenQuarn {
namespace {

void connect(const HPlug& from, const HPlug& to) {
    TentativeSlot source(from);
    TentativeSlot destination(to);
    if (!source.get() || !destination.get())
        throw std::invalid_argument("'" + from.name().asStdString() + "' or '" + to.name().asStdString() +
                                    "' does not name one place");
    Graph& graph = currentGraph();
    graph.connect(*source.get(), *destination.get());
    for (TentativeSlot* end : {&source, &destination}) {
        if (end->isNew())
            graph.notify(*end->get(), HNodeMessage::kAttributeArrayAdded);
        end->keep();
    }
}

// breaking a connection may remove the element that it leads to: everything is found by plug again
void connectInstead(const HPlug& present, const HPlug& from, const HPlug& to) {
    currentGraph().disconnect(*resolvePlug(normalContext, to));
    try {
        connect(from, to);
    } catch (...) {
        connect(present, to);
        throw;
    }
}

class ConnectAttr : public Builtin {
    HStatus run(const Arguments& args) override {
        const HPlug from = plugNamed(args.text(0));
        const HPlug to = plugNamed(args.text(1));
        const std::shared_ptr<Slot> slot = resolvePlug(normalContext, to);
        const HPlug present = slot && slot->source() ? makePlug(*slot->source()) : HPlug();
        if (present.isNull() || !args.has("force"))
            connect(from, to);
        else if (present != from)
            connectInstead(present, from, to);
        return {};
    }
};

class DisconnectAttr : public Builtin {
    HStatus run(const Arguments& args) override {
        const HPlug source = plugNamed(args.text(0));
        const HPlug destination = plugNamed(args.text(1));
        const std::shared_ptr<Slot> from = resolvePlug(normalContext, source);
        const std::shared_ptr<Slot> to = resolvePlug(normalContext, destination);
        if (!from || !to || to->source() != from.get())
            throw std::invalid_argument("'" + source.name().asStdString() + "' is not connected to '" +
                                        destination.name().asStdString() + "'");
        currentGraph().disconnect(*to);
        return {};
    }
};

class ListConnections : public Builtin {
    HStatus run(const Arguments& args) override {
        const bool both = !args.has("source") && !args.has("destination");
        sources_ = both || args.has("source");
        destinations_ = both || args.has("destination");
        plugs_ = args.has("plugs");
        const std::string& name = args.text(0);
        if (!namesPlug(name))
            visitNode(*nodeNamed(name));
        else if (const std::shared_ptr<Slot> slot = resolvePlug(normalContext, plugNamed(name)))
            visit(*slot);
        give(std::move(names_));
        return {};
    }

    void visitNode(const Node& node) {
        for (const std::shared_ptr<Slot>& slot : node.data()->slots)
            visit(*slot);
    }

    // what is connected to the slot or to a part of it
    void visit(const Slot& slot) {
        if (sources_ && slot.source())
            add(*slot.source());
        if (destinations_ && slot.links)
            for (const Slot* destination : slot.links->destinations)
                add(*destination);
        slot.forEachPart([&](const Slot& part) { visit(part); });
    }

    void add(const Slot& other) {
        std::string name = plugs_ ? other.name() : other.owner->node.name();
        if (plugs_ || seen_.insert(name).second)
            names_.push_back(std::move(name));
    }

    bool sources_ = false;
    bool destinations_ = false;
    bool plugs_ = false;
    std::set<std::string> seen_;
    std::vector<std::string> names_;
};

} // namespace

void addConnectionCommands(CommandRegistry& registry) {
    addBuiltin<ConnectAttr>(registry, "connectAttr", "Connects a plug into another; -force breaks what is there.",
                            SyntaxBuilder().flag("f", "force").arg().arg());
    addBuiltin<DisconnectAttr>(registry, "disconnectAttr", "Breaks the connection of a plug into another.",
                               SyntaxBuilder().arg().arg());
    addBuiltin<ListConnections>(registry, "listConnections",
                                "Lists the nodes, or with -plugs the plugs, connected to a node or plug.",
                                SyntaxBuilder().flag("s", "source").flag("d", "destination").flag("p", "plugs").arg());
}

} // namespace OpenQuarn
