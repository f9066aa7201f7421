// SPDX-License-Identifier: Apache-2.0
#include "files/KeptScene.h"

#include "files/json.h"

namespace OpenQuarn {
namespace {

void writeMembers(JsonWriter& writer, const std::vector<KeptMember>& members) {
    writer.StartArray();
    for (const auto& [name, json] : members) {
        writer.key(name);
        writer.raw(json);
    }
    writer.EndArray();
}

std::vector<KeptMember> readMembers(const storage::JsonValue& list) {
    std::vector<KeptMember> members;
    members.reserve(list.Size() / 2);
    for (rapidjson::SizeType i = 0; i + 1 < list.Size(); i += 2)
        members.emplace_back(viewOf(list[i]), jsonOf(list[i + 1]));
    return members;
}

} // namespace

// [[name, value, …], [path, value, …], [locked, …]]
std::string KeptNode::toText() const {
    if (empty())
        return {};
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartArray();
    writeMembers(writer, members);
    writeMembers(writer, values);
    writer.StartArray();
    for (const std::string& json : locked)
        writer.raw(json);
    writer.EndArray();
    writer.EndArray();
    return {buffer.GetString(), buffer.GetSize()};
}

KeptNode KeptNode::fromText(const std::string& text) {
    KeptNode kept;
    if (text.empty())
        return kept;
    const storage::JsonDocument document = storage::parseJson(text, storage::jsonRules::scene);
    kept.members = readMembers(document[0]);
    kept.values = readMembers(document[1]);
    for (const storage::JsonValue& item : document[2].GetArray())
        kept.locked.push_back(jsonOf(item));
    return kept;
}

} // namespace OpenQuarn
