// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/prepareGltf.h"

#include "quarn/character/checkGltf.h"
#include "storage/encodings.h"

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include <string_view>

namespace quarn {
namespace {

// The binary form, after the glTF 2.0 specification, 4.4 "Binary glTF Layout": magic, version and length, then chunks
// of length, type and data, the first of them the JSON text. All numbers are little-endian.
constexpr std::string_view glbMagic = "glTF";
constexpr std::size_t glbHeader = 12;
constexpr std::size_t chunkHeader = 8;

std::uint32_t numberAt(std::string_view bytes, std::size_t at) {
    std::uint32_t value = 0;
    for (std::size_t i = 4; i-- > 0;)
        value = value << 8U | static_cast<unsigned char>(bytes[at + i]);
    return value;
}

void appendNumber(std::string& bytes, std::size_t value) {
    for (unsigned shift = 0; shift < 32; shift += 8)
        bytes.push_back(static_cast<char>(value >> shift & 0xFFU));
}

struct Parts {
    std::string_view json;
    std::string_view chunks; ///< what follows the JSON chunk of the binary form
};

Parts partsOf(std::string_view bytes) {
    if (bytes.substr(0, glbMagic.size()) != glbMagic)
        return {bytes, {}};
    if (bytes.size() < glbHeader + chunkHeader || numberAt(bytes, 16) != numberAt("JSON", 0))
        throw std::runtime_error("the binary glTF file does not begin with its JSON text");
    if (numberAt(bytes, 4) != 2)
        throw std::runtime_error("binary glTF of version " + std::to_string(numberAt(bytes, 4)) + ", not 2");
    const std::size_t length = numberAt(bytes, 12);
    if (length > bytes.size() - glbHeader - chunkHeader)
        throw std::runtime_error("the binary glTF file ends in its JSON text");
    std::string_view chunks = bytes.substr(glbHeader + chunkHeader + length);
    if (!chunks.empty() && (chunks.size() < chunkHeader || numberAt(chunks, 0) > chunks.size() - chunkHeader))
        throw std::runtime_error("the binary glTF file ends in its binary data");
    std::string_view json = bytes.substr(glbHeader + chunkHeader, length);
    json.remove_suffix(json.size() - (json.find_last_not_of('\0') + 1)); // some writers fill it up so
    return {json, chunks};
}

std::string joined(std::string json, std::string_view chunks) {
    json.resize((json.size() + 3) / 4 * 4, ' ');
    std::string bytes(glbMagic);
    appendNumber(bytes, 2);
    appendNumber(bytes, glbHeader + chunkHeader + json.size() + chunks.size());
    appendNumber(bytes, json.size());
    return bytes + "JSON" + json + std::string(chunks);
}

void checkObjects(const JsonValue& list, const std::string& things) {
    for (const JsonValue& entry : list.GetArray())
        if (!entry.IsObject())
            throw std::runtime_error("one of the " + things + " is not an object");
}

storage::JsonDocument parse(std::string_view json) {
    storage::JsonDocument document = storage::parseJson(json, storage::jsonRules::character);
    const JsonValue* asset = member(document, "asset");
    const std::string version = asset == nullptr ? "" : textOf(*asset, "version");
    if (version.substr(0, 2) != "2.")
        throw std::runtime_error("glTF of version \"" + version + "\", not 2");
    return document;
}

std::string nodeId(std::size_t index) {
    return "n" + std::to_string(index);
}

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

JsonValue& arrayMember(JsonValue& object, const char* key, storage::JsonDocument& document) {
    if (member(object, key) == nullptr)
        object.AddMember(rapidjson::StringRef(key), JsonValue(rapidjson::kArrayType), document.GetAllocator());
    return object[key];
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
    for (unsigned set = 0; keep("JOINTS_" + std::to_string(set)) && keep("WEIGHTS_" + std::to_string(set));)
        ++set;
    attributes = kept;
}

// what is not read had better not be there: the importer would follow its indices
void removeUnread(storage::JsonDocument& document, SourceHints& hints) {
    for (const char* key : {"materials", "textures", "images", "samplers", "cameras", "extensions", "extensionsUsed",
                            "extensionsRequired"})
        document.RemoveMember(key);
    for (JsonValue& node : arrayMember(document, "nodes", document).GetArray())
        for (const char* key : {"camera", "extensions", "weights"})
            node.RemoveMember(key);
    std::size_t index = 0;
    for (JsonValue& mesh : arrayMember(document, "meshes", document).GetArray()) {
        bool morphs = false;
        mesh.RemoveMember("weights");
        for (JsonValue& primitive : arrayMember(mesh, "primitives", document).GetArray()) {
            morphs = primitive.RemoveMember("targets") || morphs;
            primitive.RemoveMember("material");
            primitive.RemoveMember("extensions");
            keepReadAttributes(primitive, document);
        }
        if (morphs)
            hints.warnings.push_back(element("meshes", index) + " has morph targets, which are not read");
        ++index;
    }
}

std::string identities(std::size_t count) {
    std::string bytes;
    for (std::size_t value = 0; value < 16 * count; ++value)
        bytes += value % 16 % 5 == 0 ? std::string("\0\0\x80\x3F", 4) : std::string(4, '\0');
    return bytes;
}

// the index of a new accessor of `count` identity matrices, in a buffer of its own
rapidjson::SizeType addIdentities(storage::JsonDocument& document, std::size_t count) {
    auto& memory = document.GetAllocator();
    const std::string bytes = identities(count);
    const std::string uri = "data:application/octet-stream;base64," + storage::base64(bytes);
    const auto add = [&](const char* key, JsonValue& value) {
        JsonValue& values = arrayMember(document, key, document);
        values.PushBack(value, memory);
        return values.Size() - 1;
    };
    JsonValue buffer(rapidjson::kObjectType);
    buffer.AddMember("byteLength", std::uint64_t{bytes.size()}, memory);
    buffer.AddMember("uri", JsonValue(uri.c_str(), memory), memory);
    JsonValue view(rapidjson::kObjectType);
    view.AddMember("buffer", add("buffers", buffer), memory);
    view.AddMember("byteLength", std::uint64_t{bytes.size()}, memory);
    JsonValue accessor(rapidjson::kObjectType);
    accessor.AddMember("bufferView", add("bufferViews", view), memory);
    accessor.AddMember("componentType", 5126, memory);
    accessor.AddMember("type", "MAT4", memory);
    accessor.AddMember("count", std::uint64_t{count}, memory);
    return add("accessors", accessor);
}

// a skin without bind matrices has identities, which the importer does not know
void addBindMatrices(storage::JsonDocument& document) {
    for (JsonValue& skin : arrayMember(document, "skins", document).GetArray()) {
        if (member(skin, "inverseBindMatrices") != nullptr)
            continue;
        const rapidjson::SizeType accessor = addIdentities(document, listOf(skin, "joints").Size());
        skin.AddMember("inverseBindMatrices", accessor, document.GetAllocator());
    }
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

std::string prepareGltf(const std::string& bytes, SourceHints& hints) {
    const Parts parts = partsOf(bytes);
    storage::JsonDocument document = parse(parts.json);
    for (const char* things : {"nodes", "meshes", "animations", "accessors", "bufferViews", "buffers", "skins"})
        checkObjects(listOf(document, things), things);
    checkGltf(document);
    renameNodes(document, hints);
    removeUnread(document, hints);
    addBindMatrices(document);
    std::size_t index = 0;
    for (JsonValue& animation : arrayMember(document, "animations", document).GetArray()) {
        removeOtherChannels(arrayMember(animation, "channels", document));
        noteInterpolations(animation, index++, hints);
    }

    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    document.Accept(writer);
    std::string json(buffer.GetString(), buffer.GetSize());
    return bytes.data() == parts.json.data() ? json : joined(std::move(json), parts.chunks);
}

} // namespace quarn
