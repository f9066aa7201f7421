// SPDX-License-Identifier: Apache-2.0
#include "plugins/Plugin.h"

#include "commands/CommandRegistry.h"
#include "core/text.h"
#include "gpu/GPUDeformers.h"
#include "graph/Graph.h"
#include "types/Data.h"
#include "types/baseNodes.h"

#include <algorithm>
#include <iterator>
#include <stdexcept>

namespace OpenQuarn {
namespace {

std::string counted(std::size_t count, const std::string& thing) {
    return std::to_string(count) + " " + thing + (count == 1 ? "" : "s");
}

std::string firstOf(const Graph& graph, const NodeClass& type) {
    const std::vector<std::shared_ptr<Node>> nodes = graph.nodes();
    const auto first = std::find_if(nodes.begin(), nodes.end(),
                                    [&](const std::shared_ptr<Node>& node) { return &node->type() == &type; });
    return first == nodes.end() ? std::string() : (*first)->name();
}

std::string nodeUsers(const Registration& registration) {
    const std::shared_ptr<const NodeClass> type = findNodeClass(registration.id);
    std::size_t count = 0;
    std::string first;
    for (const Graph* graph : type ? Graph::all() : std::vector<Graph*>()) {
        if (first.empty() && graph->nodeCount(*type) > 0)
            first = firstOf(*graph, *type);
        count += graph->nodeCount(*type);
    }
    return count == 0 ? std::string()
                      : counted(count, "node") + " of type '" + type->name + "', such as '" + first + "'";
}

std::string dataUsers(const Registration& registration) {
    const std::shared_ptr<const DataType> type = findDataType(registration.id);
    const int count = type ? type->objects.load() : 0;
    return count == 0 ? std::string()
                      : counted(static_cast<std::size_t>(count), "object") + " of data type '" + type->name + "'";
}

void deleteNodesOf(HTypeId id) {
    const std::shared_ptr<const NodeClass> type = findNodeClass(id);
    if (!type)
        return;
    for (Graph* graph : Graph::all())
        for (const std::shared_ptr<Node>& node : graph->nodes())
            if (&node->type() == type.get() && node->isAlive()) // one may have deleted others
                graph->deleteNode(*node);
}

} // namespace

std::string describe(const Registration& registration) {
    const char* const kinds[] = {"node type", "data type", "command", "GPU deformer of node type"};
    return std::string(kinds[static_cast<int>(registration.kind)]) + " '" + registration.name + "'";
}

std::string describe(const std::vector<Registration>& registrations) {
    std::string text;
    for (const Registration& registration : registrations)
        text += (text.empty() ? "" : ", ") + describe(registration);
    return text;
}

std::string usersOf(const Registration& registration) {
    if (registration.kind == Registration::Kind::node)
        return nodeUsers(registration);
    return registration.kind == Registration::Kind::data ? dataUsers(registration) : std::string();
}

Plugin::Plugin(std::string pluginName, std::string pluginPath, std::string builtFor)
    : name(std::move(pluginName))
    , path(std::move(pluginPath))
    , apiVersion(std::move(builtFor)) {}

void Plugin::introduce(const std::string& vendor, const std::string& version) {
    if (introduced_)
        return;
    vendor_ = vendor;
    version_ = version;
    introduced_ = true;
}

bool Plugin::hasTakenBack(Registration::Kind kind, const std::string& registered) const {
    return std::any_of(takenBack_.begin(), takenBack_.end(),
                       [&](const Registration& gone) { return gone.kind == kind && gone.name == registered; });
}

void Plugin::unloadFailed(const std::vector<Registration>& before) {
    std::copy_if(before.begin(), before.end(), std::back_inserter(takenBack_), [&](const Registration& registration) {
        return std::find(registrations_.begin(), registrations_.end(), registration) == registrations_.end();
    });
}

template <class Call>
void Plugin::tracked(Registration registration, Call&& call) {
    takenBack_.erase(std::remove(takenBack_.begin(), takenBack_.end(), registration), takenBack_.end());
    registrations_.push_back(std::move(registration));
    try {
        std::forward<Call>(call)();
    } catch (...) {
        registrations_.pop_back();
        throw;
    }
}

void Plugin::registerNode(const std::string& typeName, HTypeId id, HPxNode* (*creator)(), HStatus (*initializer)(),
                          HPxNode::Type type) {
    const std::shared_ptr<NodeClass> built = buildNodeClass(typeName, id, type, creator, initializer);
    built->plugin = name;
    tracked({Registration::Kind::node, typeName, id}, [&] { addNodeClass(built); });
}

void Plugin::registerData(const std::string& typeName, HTypeId id, HPxData* (*creator)()) {
    const auto type = std::make_shared<DataType>();
    type->name = typeName;
    type->id = id;
    type->creator = creator;
    tracked({Registration::Kind::data, typeName, id}, [&] { addDataType(type); });
}

void Plugin::registerGPUDeformer(const std::string& nodeType, const std::string& registrant,
                                 HGPUDeformerRegistrationInfo* info) {
    tracked({Registration::Kind::gpuDeformer, nodeType, {}}, [&] { addGPUDeformer(nodeType, registrant, info); });
}

HStatus Plugin::registerCommand(const std::string& command, HPxCommand* (*creator)(), HSyntax (*syntax)()) {
    HStatus status;
    tracked({Registration::Kind::command, command, {}},
            [&] { status = CommandRegistry::instance().add(command, creator, syntax, this); });
    if (status.error())
        registrations_.pop_back();
    return status;
}

void Plugin::deregister(Registration::Kind kind, HTypeId id) {
    const auto isMeant = [&](const Registration& one) { return one.kind == kind && one.id == id; };
    const auto place = std::find_if(registrations_.begin(), registrations_.end(), isMeant);
    if (place == registrations_.end() && std::any_of(takenBack_.begin(), takenBack_.end(), isMeant))
        return;
    if (place == registrations_.end())
        throw std::invalid_argument("plug-in '" + name + "' has registered no " +
                                    (kind == Registration::Kind::node ? "node" : "data") + " type " + hexText(id));
    remove(place);
}

void Plugin::deregister(Registration::Kind kind, const std::string& registered) {
    const auto place = std::find_if(registrations_.begin(), registrations_.end(), [&](const Registration& present) {
        return present.kind == kind && present.name == registered;
    });
    if (place == registrations_.end() && hasTakenBack(kind, registered))
        return;
    if (place == registrations_.end())
        throw std::invalid_argument("plug-in '" + name + "' has registered no " +
                                    describe(Registration{kind, registered, {}}));
    remove(place);
}

void Plugin::remove(Place place) {
    const std::string users = usersOf(*place);
    if (!users.empty())
        throw std::invalid_argument(describe(*place) + " cannot be deregistered: there are still " + users);
    removeFrom(*place);
    registrations_.erase(place);
}

void Plugin::removeFrom(const Registration& registration) const {
    switch (registration.kind) {
    case Registration::Kind::node:
        removeNodeClass(registration.id);
        break;
    case Registration::Kind::data:
        removeDataType(registration.id);
        break;
    case Registration::Kind::gpuDeformer:
        removeGPUDeformer(registration.name);
        break;
    case Registration::Kind::command:
        const HStatus status = CommandRegistry::instance().remove(registration.name, this);
        if (status.error())
            throw std::runtime_error(status.errorString().asStdString());
        break;
    }
}

std::string Plugin::users() const {
    std::string all;
    for (const Registration& registration : registrations_) {
        const std::string users = usersOf(registration);
        if (!users.empty())
            all += (all.empty() ? "" : ", ") + users;
    }
    return all;
}

std::vector<Registration> Plugin::removeAll() {
    std::vector<Registration> found = registrations_;
    for (std::size_t i = registrations_.size(); i-- > 0;) {
        const auto place = registrations_.begin() + static_cast<std::ptrdiff_t>(i);
        if (place->kind == Registration::Kind::node)
            deleteNodesOf(place->id);
        try {
            remove(place);
        } catch (const std::exception&) {
            continue; // stays in the list, where the caller finds it
        }
    }
    return found;
}

} // namespace OpenQuarn
