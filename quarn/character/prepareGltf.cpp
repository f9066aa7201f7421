// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/prepareGltf.h"

#include "quarn/character/GltfBytes.h"
#include "quarn/character/PlainAccessors.h"
#include "quarn/character/gltfContainer.h"
#include "quarn/character/gltfMorphs.h"
#include "quarn/character/gltfTypes.h"

namespace quarn {
namespace {

void renameNodes(storage::JsonDocument& document, SourceHints& hints) {
    const auto nodes = document.FindMember("nodes");
    if (nodes == document.MemberEnd())
        return;
    std::size_t index = 0;
    for (JsonValue& node : nodes->value.GetArray()) {
        hints.nodeNames[nodeId(index)] = textOf(node, "name");
        node.RemoveMember("name");
        JsonValue id(nodeId(index++).c_str(), document.GetAllocator());
        node.AddMember("name", id, document.GetAllocator());
    }
}

// only what is read, and JOINTS_0 before JOINTS_1: the importer counts them as they come
void keepReadAttributes(JsonValue& primitive, storage::JsonDocument& document) {
    JsonValue& attributes = primitive["attributes"];
    JsonValue kept(rapidjson::kObjectType);
    const auto keep = [&](const std::string& name) {
        const auto found = attributes.FindMember(name.c_str());
        if (found == attributes.MemberEnd())
            return false;
        kept.AddMember(JsonValue(name.c_str(), document.GetAllocator()), found->value, document.GetAllocator());
        return true;
    };
    keep("POSITION");
    keep("TEXCOORD_0");
    for (unsigned set = 0; keep("JOINTS_" + std::to_string(set)) && keep("WEIGHTS_" + std::to_string(set));)
        ++set;
    attributes = kept;
}

// Draco is the importer's to decode
bool keepDraco(JsonValue& primitive, storage::JsonDocument& document) {
    JsonValue extensions(rapidjson::kObjectType);
    const bool isDraco = extensionOf(primitive, dracoExtension) != nullptr;
    if (isDraco)
        extensions.AddMember(rapidjson::StringRef(dracoExtension), primitive["extensions"][dracoExtension],
                             document.GetAllocator());
    primitive.RemoveMember("extensions");
    if (isDraco)
        primitive.AddMember("extensions", extensions, document.GetAllocator());
    return isDraco;
}

// what is not read had better not be there: the importer would follow its indices
void removeUnread(storage::JsonDocument& document) {
    for (const char* key : {"materials", "textures", "images", "samplers", "cameras", "extensions", "extensionsUsed",
                            "extensionsRequired"})
        document.RemoveMember(key);
    for (JsonValue& node : arrayMember(document, "nodes", document).GetArray())
        for (const char* key : {"camera", "extensions", "weights"})
            node.RemoveMember(key);
    bool hasDraco = false;
    for (JsonValue& mesh : arrayMember(document, "meshes", document).GetArray()) {
        mesh.RemoveMember("weights");
        for (JsonValue& primitive : arrayMember(mesh, "primitives", document).GetArray()) {
            primitive.RemoveMember("targets");
            primitive.RemoveMember("material");
            keepReadAttributes(primitive, document);
            hasDraco = keepDraco(primitive, document) || hasDraco;
        }
    }
    if (hasDraco)
        for (const char* key : {"extensionsUsed", "extensionsRequired"})
            arrayMember(document, key, document)
                .PushBack(rapidjson::StringRef(dracoExtension), document.GetAllocator());
}

std::string identities(std::size_t count) {
    std::string bytes;
    for (std::size_t value = 0; value < 16 * count; ++value)
        bytes += value % 16 % 5 == 0 ? std::string("\0\0\x80\x3F", 4) : std::string(4, '\0');
    return bytes;
}

// a skin without bind matrices has identities, which the importer does not know
void addBindMatrices(storage::JsonDocument& document, PlainAccessors& accessors) {
    for (JsonValue& skin : arrayMember(document, "skins", document).GetArray()) {
        if (member(skin, "inverseBindMatrices") != nullptr)
            continue;
        const std::size_t count = listOf(skin, "joints").Size();
        skin.AddMember("inverseBindMatrices", accessors.add("MAT4", gltfComponent::single, count, identities(count)),
                       document.GetAllocator());
    }
}

void makePlain(storage::JsonDocument& document, PlainAccessors& accessors) {
    for (JsonValue& mesh : arrayMember(document, "meshes", document).GetArray())
        for (JsonValue& primitive : arrayMember(mesh, "primitives", document).GetArray()) {
            if (extensionOf(primitive, dracoExtension) != nullptr)
                continue;
            for (auto& attribute : primitive["attributes"].GetObject())
                accessors.makePlain(attribute.value, textOf(attribute.name).starts_with("JOINTS_"));
            if (member(primitive, "indices") != nullptr)
                accessors.makePlain(primitive["indices"], true);
        }
    for (JsonValue& skin : arrayMember(document, "skins", document).GetArray())
        if (member(skin, "inverseBindMatrices") != nullptr)
            accessors.makePlain(skin["inverseBindMatrices"], false);
}

// with a sampler of its own for each channel: the importer would follow those that no channel has
void makePlain(JsonValue& animation, storage::JsonDocument& document, PlainAccessors& accessors) {
    const JsonValue& samplers = arrayMember(animation, "samplers", document);
    JsonValue kept(rapidjson::kArrayType);
    for (JsonValue& channel : arrayMember(animation, "channels", document).GetArray()) {
        JsonValue sampler(samplers[channel["sampler"].GetUint()], document.GetAllocator());
        accessors.makePlain(sampler["input"], false);
        accessors.makePlain(sampler["output"], false);
        channel["sampler"].SetUint(kept.Size());
        kept.PushBack(sampler, document.GetAllocator());
    }
    animation["samplers"] = kept;
}

std::optional<TrackKind> trackKind(const std::string& path) {
    if (path == "translation")
        return TrackKind::Translation;
    if (path == "rotation")
        return TrackKind::Rotation;
    if (path == "scale")
        return TrackKind::Scale;
    return std::nullopt;
}

bool movesNode(const JsonValue& channel) {
    const JsonValue& target = *member(channel, "target");
    return member(target, "node") != nullptr && trackKind(textOf(target, "path"));
}

void removeOtherChannels(JsonValue& channels) {
    for (auto channel = channels.Begin(); channel != channels.End();)
        channel = movesNode(*channel) ? channel + 1 : channels.Erase(channel);
}

void noteInterpolations(const JsonValue& animation, std::size_t index, SourceHints& hints) {
    bool cubic = false;
    const JsonValue& samplers = listOf(animation, "samplers");
    for (const JsonValue& channel : listOf(animation, "channels").GetArray()) {
        const JsonValue& target = *member(channel, "target");
        const std::size_t node = member(target, "node")->GetUint();
        const std::string interpolation = textOf(samplers[member(channel, "sampler")->GetUint()], "interpolation");
        if (interpolation == "STEP")
            hints.stepTracks.emplace(index, nodeId(node), *trackKind(textOf(target, "path")));
        cubic = cubic || interpolation == "CUBICSPLINE";
    }
    if (cubic)
        hints.warnings.push_back(element("animations", index) +
                                 " has cubic splines: their keys are read, and straight lines between them");
}

} // namespace

std::string prepareGltf(const std::string& bytes, SourceHints& hints, const ReadUri& readUri) {
    const GltfParts parts = gltfParts(bytes);
    storage::JsonDocument document = parseGltf(parts.json);
    renameNodes(document, hints);
    GltfBytes data(document, parts.binary, readUri);
    readMorphs(document, data, hints);
    removeUnread(document);
    PlainAccessors accessors(document, data);
    makePlain(document, accessors);
    std::size_t index = 0;
    for (JsonValue& animation : arrayMember(document, "animations", document).GetArray()) {
        removeOtherChannels(arrayMember(animation, "channels", document));
        noteInterpolations(animation, index++, hints);
        makePlain(animation, document, accessors);
    }
    addBindMatrices(document, accessors);
    accessors.finish();

    std::string json = gltfText(document);
    return bytes.data() == parts.json.data() ? json : binaryGltf(std::move(json), parts.chunks);
}

} // namespace quarn
