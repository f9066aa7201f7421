// SPDX-License-Identifier: Apache-2.0
#include "core/text.h"
#include "files/KeptScene.h"
#include "files/json.h"
#include "files/sceneText.h"
#include "files/valueFiles.h"
#include "graph/plugImpl.h"
#include "graph/plugName.h"
#include "services/SceneFileState.h"
#include "types/baseNodes.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <set>
#include <stdexcept>
#include <unordered_set>

namespace OpenQuarn {
namespace {

using Value = storage::JsonValue;

std::string quoted(std::string_view text) {
    return "'" + std::string(text) + "'";
}

/// The members of a JSON object: the first of each known key that is of the right kind, and the others.
class Members {
public:
    explicit Members(std::string whose, Warnings& warnings)
        : whose_(std::move(whose))
        , warnings_(warnings) {}

    /// A key that the reader knows, and what its value has to be; `value` receives it.
    void expect(const char* key, bool (Value::*isKind)() const, const char* kind, const Value*& value) {
        known_.push_back({key, isKind, kind, &value});
    }

    void read(const Value& object, std::vector<KeptMember>& kept) {
        for (const auto& member : object.GetObject())
            if (!take(viewOf(member.name), member.value))
                kept.emplace_back(viewOf(member.name), jsonOf(member.value));
    }

private:
    struct Known {
        std::string_view key;
        bool (Value::*isKind)() const;
        const char* kind;
        const Value** value;
    };

    bool take(std::string_view key, const Value& value) {
        const auto known =
            std::find_if(known_.begin(), known_.end(), [&](const Known& entry) { return entry.key == key; });
        if (known == known_.end()) {
            warnings_.add(whose_ + ": the key " + quoted(key) + " is not known; it is kept as it is");
        } else if (*known->value) {
            warnings_.add(whose_ + ": the key " + quoted(key) + " stands twice; the first counts, the other is kept");
        } else if (!(value.*known->isKind)()) {
            warnings_.add(whose_ + ": " + quoted(key) + " is no " + known->kind + "; it is kept as it is");
        } else {
            *known->value = &value;
            return true;
        }
        return false;
    }

    const std::string whose_;
    Warnings& warnings_;
    std::vector<Known> known_;
};

/// Of a node of the file that could not be created: how many of its kind, for one warning about all of them.
struct Missing {
    std::size_t count = 0;
    std::string first;
};

class SceneReader {
public:
    SceneReader(Graph& graph, Warnings& warnings)
        : graph_(graph)
        , warnings_(warnings) {
        for (const std::shared_ptr<const NodeClass>& type : nodeClasses())
            typesById_.emplace(type->id.id(), type);
    }

    void run(const Value& root, int version) {
        if (version > sceneFormatVersion)
            warnings_.add("the file is of version " + std::to_string(version) + ", this host knows versions up to " +
                          std::to_string(sceneFormatVersion) + ": what it does not understand is kept");
        auto kept = std::make_unique<KeptScene>();
        kept_ = kept.get();
        const Value *time = nullptr, *plugins = nullptr, *nodes = nullptr, *connections = nullptr;
        const Value *writtenBy = nullptr, *versionValue = nullptr;
        Members members("the scene", warnings_);
        members.expect(SceneKey::version, &Value::IsNumber, "number", versionValue);
        members.expect(SceneKey::writtenBy, &Value::IsString, "text", writtenBy);
        members.expect(SceneKey::time, &Value::IsNumber, "number", time);
        members.expect(SceneKey::plugins, &Value::IsArray, "list", plugins);
        members.expect(SceneKey::nodes, &Value::IsArray, "list", nodes);
        members.expect(SceneKey::connections, &Value::IsArray, "list", connections);
        members.read(root, kept_->members);

        graph_.clear(time ? time->GetDouble() : 1.0);
        graph_.keptFileContent = std::move(kept);
        if (nodes)
            readNodes(*nodes);
        if (connections)
            readConnections(*connections);
        for (const auto& [node, list] : locked_)
            readLocked(node, *list);
        breakCycles();
        if (plugins)
            readPlugins(*plugins);
        storeKept();
    }

private:
    // --- nodes ---

    void readNodes(const Value& nodes) {
        claimTimeNode(nodes);
        for (const Value& entry : nodes.GetArray())
            fileNames_.emplace(textMember(entry, SceneKey::name));
        kept_->nodes.reserve(nodes.Size());
        for (const Value& entry : nodes.GetArray())
            readNode(entry);
        for (const auto& [what, missing] : missing_)
            warnings_.add(what + ": " + std::to_string(missing.count) +
                          (missing.count == 1 ? " node (" : " nodes (the first is ") + quoted(missing.first) +
                          ") kept as in the file");
        if (missing_.empty())
            kept_->nodes.clear();
    }

    // The scene has its time node already: the first of the file is that one, under the file's name.
    void claimTimeNode(const Value& nodes) {
        for (const Value& entry : nodes.GetArray()) {
            if (textMember(entry, SceneKey::type) != timeClass()->name || typeOf(entry) != timeClass())
                continue;
            const std::string name(textMember(entry, SceneKey::name));
            if (!isIdentifier(name))
                continue;
            graph_.renameNode(*graph_.timeNode(), name);
            timeEntry_ = &entry;
            return;
        }
    }

    static std::string_view textMember(const Value& object, const char* key) {
        if (!object.IsObject())
            return {};
        const auto member = object.FindMember(key);
        return member != object.MemberEnd() && member->value.IsString() ? viewOf(member->value) : std::string_view();
    }

    void readNode(const Value& entry) {
        std::string why;
        const std::shared_ptr<Node> node = createNode(entry, why);
        if (!node) {
            keepNode(entry, why);
            return;
        }
        kept_->nodes.push_back({node, {}});
        readContent(entry, node);
    }

    void keepNode(const Value& entry, const std::string& why) {
        const std::string name(textMember(entry, SceneKey::name));
        kept_->nodes.push_back({{}, jsonOf(entry)});
        if (isIdentifier(name)) {
            graph_.reserveName(name);
            missingNodes_.insert(name);
        }
        Missing& missing = missing_[why];
        if (missing.count++ == 0)
            missing.first = name;
    }

    // Null, with a reason, when the type is not registered.
    std::shared_ptr<const NodeClass> registeredType(const Value& entry, std::string& why) {
        const std::string_view typeName = textMember(entry, SceneKey::type);
        const std::string_view plugin = textMember(entry, SceneKey::plugin);
        std::shared_ptr<const NodeClass> type = typeOf(entry);
        if (!type)
            why = "node type " + quoted(typeName) + (plugin.empty() ? "" : " of plug-in " + quoted(plugin)) +
                  " is not registered";
        else if (type->name != typeName && renamedTypes_.insert(type.get()).second)
            warnings_.add("node type " + quoted(typeName) + " is called " + quoted(type->name) + " now");
        return type;
    }

    // The id says which type it is; the name, where there is no id.
    std::shared_ptr<const NodeClass> typeOf(const Value& entry) const {
        if (!entry.IsObject())
            return nullptr;
        const auto id = entry.FindMember(SceneKey::typeId);
        if (id == entry.MemberEnd() || !id->value.IsUint())
            return findNodeClass(std::string(textMember(entry, SceneKey::type)));
        const auto found = typesById_.find(id->value.GetUint());
        return found == typesById_.end() ? nullptr : found->second;
    }

    std::shared_ptr<Node> createNode(const Value& entry, std::string& why) {
        if (&entry == timeEntry_)
            return graph_.timeNode();
        const std::string name(textMember(entry, SceneKey::name));
        if (!entry.IsObject() || !isIdentifier(name)) {
            why = entry.IsObject() ? "a node without a usable name" : "a node that is no object";
            return nullptr;
        }
        const std::shared_ptr<const NodeClass> type = registeredType(entry, why);
        if (!type)
            return nullptr;
        try {
            return graph_.createNode(type, uniqueName(name));
        } catch (const std::exception& error) {
            why = error.what();
            return nullptr;
        }
    }

    // Another name for a node whose name another one of the file has; a name that no node of the file has.
    std::string uniqueName(const std::string& name) {
        const auto isUsed = [&](const std::string& wanted) {
            return graph_.find(wanted) || missingNodes_.count(wanted) > 0;
        };
        if (!isUsed(name))
            return name;
        unsigned& number = nextNumber_[name];
        std::string free;
        do {
            free = name + std::to_string(++number);
        } while (fileNames_.count(free) > 0 || isUsed(free));
        warnings_.add("there are two nodes named " + quoted(name) + "; the second is " + quoted(free) + " now");
        return free;
    }

    void readContent(const Value& entry, const std::shared_ptr<Node>& node) {
        KeptNode kept;
        const Value *name = nullptr, *type = nullptr, *id = nullptr, *plugin = nullptr;
        const Value *values = nullptr, *locked = nullptr;
        Members members("node " + quoted(node->name()), warnings_);
        members.expect(SceneKey::name, &Value::IsString, "text", name);
        members.expect(SceneKey::type, &Value::IsString, "text", type);
        members.expect(SceneKey::typeId, &Value::IsUint, "type id", id);
        members.expect(SceneKey::plugin, &Value::IsString, "text", plugin);
        members.expect(SceneKey::values, &Value::IsObject, "object", values);
        members.expect(SceneKey::locked, &Value::IsArray, "list", locked);
        members.read(entry, kept.members);
        if (values)
            readValues(*values, node, kept.values, warnings_);
        if (locked)
            locked_.emplace_back(node, locked);
        if (!kept.empty())
            keptOfNodes_[node.get()] = std::move(kept);
    }

    // --- locks ---

    void readLocked(const std::shared_ptr<Node>& node, const Value& list) {
        for (const Value& item : list.GetArray())
            if (const std::string why = lock(node, item); !why.empty()) {
                warnings_.add("node " + quoted(node->name()) + ": a locked plug is kept as it is: " + why);
                keptOfNodes_[node.get()].locked.push_back(jsonOf(item));
            }
    }

    static std::string lock(const std::shared_ptr<Node>& node, const Value& item) {
        if (!item.IsString())
            return "its name is no text";
        try {
            const HPlug plug = plugNamed(node, std::string(viewOf(item)));
            resolvePlugIn(*node->data(), plug, true)->locked = true;
            return {};
        } catch (const std::invalid_argument& error) {
            return error.what();
        }
    }

    // --- connections ---

    struct Found {
        std::shared_ptr<Node> node;
        std::unique_ptr<TentativeSlot> slot;
        std::string why;        ///< when there is no slot
        bool isMissing = false; ///< of a node that could not be created
        KeptScene::End end;
    };

    void readConnections(const Value& connections) {
        std::size_t ofMissing = 0;
        for (const Value& entry : connections.GetArray()) {
            const bool isPair = entry.IsArray() && entry.Size() == 2 && entry[0].IsString() && entry[1].IsString();
            if (isPair) {
                ofMissing += connect(viewOf(entry[0]), viewOf(entry[1])) ? 0U : 1U;
            } else {
                kept_->connections.push_back({{}, {}, jsonOf(entry)});
                warnings_.add("a connection is no pair of names; it is kept as it is");
            }
        }
        if (ofMissing > 0)
            warnings_.add("connections of nodes that could not be created: " + std::to_string(ofMissing) +
                          " kept as in the file");
    }

    // False when one of the nodes could not be created.
    bool connect(std::string_view sourceName, std::string_view destinationName) {
        Found source = findEnd(sourceName);
        Found destination = findEnd(destinationName);
        const std::string both = "cannot connect " + quoted(sourceName) + " to " + quoted(destinationName) + ": ";
        if (!source.slot || !destination.slot) {
            const bool isMissing = source.isMissing || destination.isMissing;
            if (!isMissing)
                warnings_.add(both + (source.slot ? destination.why : source.why) + "; the connection is kept");
            keepConnection(std::move(source.end), std::move(destination.end));
            return !isMissing;
        }
        Slot& from = *source.slot->get();
        Slot& to = *destination.slot->get();
        const std::string refusal = graph_.refusal(from, to, false);
        if (refusal.empty()) {
            source.slot->keep();
            destination.slot->keep();
            graph_.connect(from, to, false);
        } else if (Graph::isConnectedInto(to)) {
            warnings_.add(refusal + "; the connection is dropped");
        } else {
            warnings_.add(refusal + "; the connection is kept");
            keepConnection(std::move(source.end), std::move(destination.end));
        }
        return true;
    }

    void keepConnection(KeptScene::End source, KeptScene::End destination) {
        kept_->connections.push_back({std::move(source), std::move(destination), {}});
    }

    Found findEnd(std::string_view name) const {
        Found found;
        found.end.name = name;
        const std::size_t dot = std::min(name.find('.'), name.size());
        const std::string nodeName(name.substr(0, dot));
        found.node = graph_.find(nodeName);
        if (!found.node || dot == name.size()) {
            found.isMissing = missingNodes_.count(nodeName) > 0;
            found.why = found.node ? quoted(name) + " names no plug" : "there is no node named " + quoted(nodeName);
            return found;
        }
        found.end = {found.node, true, std::string(name.substr(dot + 1))};
        try {
            found.slot = std::make_unique<TentativeSlot>(plugNamed(found.node, found.end.name));
        } catch (const std::invalid_argument& error) {
            found.why = error.what();
        }
        return found;
    }

    void breakCycles() {
        for (auto closers = graph_.cycleClosers(); !closers.empty(); closers = graph_.cycleClosers())
            for (const std::shared_ptr<Slot>& closer : closers)
                if (const Slot* source = closer->source()) { // else it went with another
                    warnings_.add("the connection from " + quoted(source->name()) + " to " + quoted(closer->name()) +
                                  " closes a cycle; it is dropped");
                    graph_.disconnect(*closer);
                }
    }

    // --- what is kept ---

    void readPlugins(const Value& plugins) {
        std::unordered_set<std::string_view> used;
        for (const std::shared_ptr<Node>& node : graph_.nodes())
            used.insert(node->type().plugin);
        for (const Value& entry : plugins.GetArray())
            if (!entry.IsString() || viewOf(entry).empty() || used.insert(viewOf(entry)).second)
                kept_->plugins.push_back({entry.IsString() ? std::string(viewOf(entry)) : "", jsonOf(entry)});
    }

    void storeKept() {
        for (const std::shared_ptr<Node>& node : graph_.nodes())
            if (const auto kept = keptOfNodes_.find(node.get()); kept != keptOfNodes_.end())
                node->unknownFileContent = kept->second.toText();
    }

    Graph& graph_;
    Warnings& warnings_;
    KeptScene* kept_ = nullptr;
    const Value* timeEntry_ = nullptr;
    std::unordered_map<std::uint32_t, std::shared_ptr<const NodeClass>> typesById_;
    std::set<const NodeClass*> renamedTypes_;
    std::map<std::string, Missing> missing_; // by what is missing
    std::unordered_set<std::string> missingNodes_;
    std::unordered_set<std::string> fileNames_; // of all its nodes
    std::unordered_map<std::string, unsigned> nextNumber_;
    std::vector<std::pair<std::shared_ptr<Node>, const Value*>> locked_;
    std::unordered_map<const Node*, KeptNode> keptOfNodes_;
};

} // namespace

storage::JsonDocument parseScene(const std::string& text) {
    storage::JsonDocument document = storage::parseJson(text, storage::jsonRules::scene);
    if (!document.IsObject())
        throw std::runtime_error("is no scene file: it holds no JSON object");
    const auto version = document.FindMember(SceneKey::version);
    if (version == document.MemberEnd() || !version->value.IsInt() || version->value.GetInt() < 1)
        throw std::runtime_error(std::string("is no scene file: it has no key '") + SceneKey::version +
                                 "' with a whole number from 1");
    return document;
}

int sceneVersion(const storage::JsonDocument& document) {
    return document[SceneKey::version].GetInt();
}

void readScene(const storage::JsonDocument& document, Graph& graph, Warnings& warnings) {
    const int version = sceneVersion(document);
    const ReadingSceneFile reading(version);
    SceneReader(graph, warnings).run(document, version);
}

} // namespace OpenQuarn
