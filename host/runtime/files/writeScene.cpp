// SPDX-License-Identifier: Apache-2.0
#include "files/KeptScene.h"
#include "files/json.h"
#include "files/sceneText.h"
#include "files/valueFiles.h"

#include <rapidjson/document.h>

#include <set>

namespace OpenQuarn {
namespace {

class SceneWriter {
public:
    SceneWriter(const Graph& graph, Warnings& warnings)
        : graph_(graph)
        , warnings_(warnings)
        , kept_(dynamic_cast<const KeptScene*>(graph.keptFileContent.get()))
        , writer_(buffer_) {}

    std::string run() {
        put("{\n");
        beginMember(SceneKey::version);
        writer_.Int(sceneFormatVersion);
        beginMember(SceneKey::writtenBy);
        writer_.text("OpenQuarn");
        beginMember(SceneKey::time);
        writer_.Double(graph_.time());
        writePlugins();
        writeNodes();
        writeConnections();
        if (kept_)
            for (const auto& [key, json] : kept_->members) {
                beginMember(key);
                writer_.raw(json);
            }
        put("\n}\n");
        return {buffer_.GetString(), buffer_.GetSize()};
    }

private:
    void put(std::string_view text) {
        for (const char c : text)
            buffer_.Put(c);
    }

    // The members of the file, and the items of its lists, stand on lines of their own. The JSON writer sees each as a
    // text of its own.
    void beginMember(std::string_view key) {
        put(isFirst_ ? "" : ",\n");
        isFirst_ = false;
        writer_.Reset(buffer_);
        writer_.key(key);
        put(":");
        writer_.Reset(buffer_);
    }
    void beginItem() {
        put(isFirst_ ? "\n" : ",\n");
        isFirst_ = false;
        writer_.Reset(buffer_);
    }
    void beginList(std::string_view key) {
        beginMember(key);
        put("[");
        isFirst_ = true;
    }
    void endList() {
        put(isFirst_ ? "]" : "\n]");
        isFirst_ = false;
    }

    void writePlugins() {
        std::set<std::string> plugins;
        for (const std::shared_ptr<Node>& node : graph_.nodes())
            if (!node->type().plugin.empty())
                plugins.insert(node->type().plugin);
        if (plugins.empty() && (!kept_ || kept_->plugins.empty()))
            return;
        beginMember(SceneKey::plugins);
        rapidjson::StringBuffer list;
        JsonWriter writer(list);
        writer.StartArray();
        for (const std::string& plugin : plugins)
            writer.text(plugin);
        if (kept_)
            for (const KeptPlugin& plugin : kept_->plugins)
                if (plugin.name.empty() || plugins.insert(plugin.name).second)
                    writer.raw(plugin.json);
        writer.EndArray();
        writer_.raw({list.GetString(), list.GetSize()});
    }

    // --- nodes ---

    void writeNodes() {
        beginList(SceneKey::nodes);
        std::set<const Object*> written;
        if (kept_)
            for (const KeptScene::FileNode& entry : kept_->nodes)
                writeFileNode(entry, written);
        for (const std::shared_ptr<Node>& node : graph_.nodes())
            if (written.count(node.get()) == 0)
                writeNode(*node);
        endList();
    }

    void writeFileNode(const KeptScene::FileNode& entry, std::set<const Object*>& written) {
        if (!entry.json.empty()) {
            beginItem();
            writer_.raw(entry.json);
            return;
        }
        const std::shared_ptr<Object> node = entry.node.lock();
        if (!node || !node->isAlive())
            return; // deleted since
        written.insert(node.get());
        writeNode(static_cast<const Node&>(*node));
    }

    void writeNode(const Node& node) {
        const KeptNode kept = KeptNode::fromText(node.unknownFileContent);
        beginItem();
        writer_.StartObject();
        writer_.key(SceneKey::name);
        writer_.text(node.name());
        writer_.key(SceneKey::type);
        writer_.text(node.type().name);
        writer_.key(SceneKey::typeId);
        writer_.Uint(node.type().id.id());
        if (!node.type().plugin.empty()) {
            writer_.key(SceneKey::plugin);
            writer_.text(node.type().plugin);
        }
        writeValues(writer_, node, kept.values, warnings_);
        writeLocked(node, kept.locked);
        for (const auto& [key, json] : kept.members) {
            writer_.key(key);
            writer_.raw(json);
        }
        writer_.EndObject();
    }

    void writeLocked(const Node& node, const std::vector<std::string>& kept) {
        std::vector<std::string> paths;
        for (const std::shared_ptr<Slot>& slot : node.data()->slots)
            addLocked(*slot, paths);
        if (paths.empty() && kept.empty())
            return;
        writer_.key(SceneKey::locked);
        writer_.StartArray();
        for (const std::string& path : paths)
            writer_.text(path);
        for (const std::string& json : kept)
            writer_.raw(json);
        writer_.EndArray();
    }

    static void addLocked(const Slot& slot, std::vector<std::string>& paths) {
        if (slot.locked)
            paths.push_back(slot.path());
        slot.forEachPart([&](const Slot& part) { addLocked(part, paths); });
    }

    // --- connections ---

    void writeConnections() {
        beginList(SceneKey::connections);
        for (const std::shared_ptr<Node>& node : graph_.nodes())
            for (const std::shared_ptr<Slot>& slot : node->data()->slots)
                writeConnectionsFrom(*slot);
        if (kept_)
            for (const KeptScene::Connection& connection : kept_->connections)
                writeKept(connection);
        endList();
    }

    void writeConnectionsFrom(const Slot& source) {
        if (source.hasDestinations()) {
            const std::string name = source.name();
            for (const Slot* destination : source.links->destinations)
                writePair(name, destination->name());
        }
        source.forEachPart([&](const Slot& part) { writeConnectionsFrom(part); });
    }

    void writeKept(const KeptScene::Connection& connection) {
        std::string source;
        std::string destination;
        if (!connection.json.empty()) {
            beginItem();
            writer_.raw(connection.json);
        } else if (nameOf(connection.source, source) && nameOf(connection.destination, destination)) {
            writePair(source, destination);
        }
    }

    // False when the node has been deleted since, and its connections with it.
    static bool nameOf(const KeptScene::End& end, std::string& name) {
        const std::shared_ptr<Object> node = end.node.lock();
        if (end.isOnNode && (!node || !node->isAlive()))
            return false;
        name = end.isOnNode ? static_cast<const Node&>(*node).name() + "." + end.name : end.name;
        return true;
    }

    void writePair(const std::string& source, const std::string& destination) {
        beginItem();
        writer_.StartArray();
        writer_.text(source);
        writer_.text(destination);
        writer_.EndArray();
    }

    const Graph& graph_;
    Warnings& warnings_;
    const KeptScene* kept_;
    rapidjson::StringBuffer buffer_;
    JsonWriter writer_;
    bool isFirst_ = true;
};

} // namespace

std::string writeScene(const Graph& graph, Warnings& warnings) {
    return SceneWriter(graph, warnings).run();
}

} // namespace OpenQuarn
