// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: accessors, morph targets, animations.
#include "quarn/play/GltfAmender.h"

#include "quarn/character/gltfContainer.h"
#include "quarn/character/gltfTypes.h"
#include "quarn/scene/gltfParts.h"

#include <algorithm>
#include <array>
#include <limits>
#include <map>
#include <ostream>

namespace quarn {
namespace {

rapidjson::SizeType sizeOf(std::size_t size) {
    return static_cast<rapidjson::SizeType>(size);
}

JsonValue& nodeAt(storage::JsonDocument& document, std::size_t node) {
    return document["nodes"][sizeOf(node)];
}

// weights that a mesh or a node has for its targets: none for those that are added
void lengthenWeights(JsonValue& owner, std::size_t count, storage::JsonDocument& document) {
    if (member(owner, "weights") == nullptr || !owner["weights"].IsArray())
        return;
    while (owner["weights"].Size() < count)
        owner["weights"].PushBack(0.0, document.GetAllocator());
}

bool isFought(const JsonValue& channel, const std::set<std::size_t>& moved, const std::set<std::size_t>& weighted) {
    const JsonValue& target = *member(channel, "target");
    const JsonValue* node = member(target, "node");
    const std::string path = textOf(target, "path");
    if (node == nullptr)
        return false;
    if (path == "weights")
        return weighted.count(node->GetUint()) > 0;
    return (path == "translation" || path == "rotation" || path == "scale") && moved.count(node->GetUint()) > 0;
}

} // namespace

GltfAmender::GltfAmender(SourceGltf& source)
    : source_(source)
    , animation_(rapidjson::kObjectType) {}

JsonValue GltfAmender::list(std::span<const float> numbers) {
    JsonValue list(rapidjson::kArrayType);
    for (const float number : numbers)
        list.PushBack(static_cast<double>(number), source_.document.GetAllocator());
    return list;
}

unsigned GltfAmender::add(const char* type, std::size_t width, std::span<const float> numbers, bool isBounded) {
    storage::JsonDocument& document = source_.document;
    auto& memory = document.GetAllocator();
    const std::string_view bytes = bytesOf(numbers);
    if (bytes.size() > std::numeric_limits<std::uint32_t>::max() - source_.binary.size() - numbers_.size())
        throw std::runtime_error("it would have more than the 4 GB that a .glb has room for");
    JsonValue view(rapidjson::kObjectType);
    view.AddMember("buffer", 0, memory);
    view.AddMember("byteOffset", std::uint64_t{source_.binary.size() + numbers_.size()}, memory);
    view.AddMember("byteLength", std::uint64_t{bytes.size()}, memory);
    numbers_ += bytes;
    JsonValue& views = arrayMember(document, "bufferViews", document);
    views.PushBack(view, memory);
    JsonValue accessor(rapidjson::kObjectType);
    accessor.AddMember("bufferView", views.Size() - 1, memory);
    accessor.AddMember("componentType", gltfFloat, memory);
    accessor.AddMember("type", rapidjson::StringRef(type), memory);
    accessor.AddMember("count", std::uint64_t{numbers.size() / width}, memory);
    if (isBounded && !numbers.empty()) {
        std::vector<float> least(numbers.begin(), numbers.begin() + static_cast<std::ptrdiff_t>(width));
        std::vector<float> most = least;
        for (std::size_t i = 0; i < numbers.size(); ++i) {
            least[i % width] = std::min(least[i % width], numbers[i]);
            most[i % width] = std::max(most[i % width], numbers[i]);
        }
        accessor.AddMember("min", list(least), memory);
        accessor.AddMember("max", list(most), memory);
    }
    JsonValue& accessors = arrayMember(document, "accessors", document);
    accessors.PushBack(accessor, memory);
    return accessors.Size() - 1;
}

// no other node shows it
JsonValue& GltfAmender::ownMesh(std::size_t node) {
    storage::JsonDocument& document = source_.document;
    JsonValue& meshes = document["meshes"];
    const unsigned index = nodeAt(document, node)["mesh"].GetUint();
    std::size_t showing = 0;
    for (const JsonValue& each : document["nodes"].GetArray())
        showing += member(each, "mesh") != nullptr && each["mesh"].GetUint() == index ? 1U : 0U;
    if (showing == 1)
        return meshes[index];
    JsonValue copy(meshes[index], document.GetAllocator());
    meshes.PushBack(copy, document.GetAllocator());
    nodeAt(document, node)["mesh"].SetUint(meshes.Size() - 1);
    return meshes[meshes.Size() - 1];
}

JsonValue GltfAmender::targetOf(const GltfPart& part, const ClipShape& shape) {
    const auto ofPart = [&](const std::vector<float>& numbers) {
        return std::span(numbers).subspan(3 * part.first, 3 * part.count);
    };
    JsonValue target(rapidjson::kObjectType);
    auto& memory = source_.document.GetAllocator();
    target.AddMember("POSITION", add("VEC3", 3, ofPart(shape.points), true), memory);
    if (part.hasNormals && !shape.normals.empty())
        target.AddMember("NORMAL", add("VEC3", 3, ofPart(shape.normals), false), memory);
    return target;
}

// where readers look for the names of targets
void GltfAmender::nameTargets(JsonValue& mesh, std::size_t known, const std::vector<ClipTarget>& targets) {
    storage::JsonDocument& document = source_.document;
    auto& memory = document.GetAllocator();
    if (member(mesh, "extras") == nullptr)
        mesh.AddMember("extras", JsonValue(rapidjson::kObjectType), memory);
    JsonValue& extras = mesh["extras"];
    if (!extras.IsObject() || (member(extras, "targetNames") != nullptr && !extras["targetNames"].IsArray()))
        return; // something else of the file's own
    JsonValue& names = arrayMember(extras, "targetNames", document);
    while (names.Size() < known)
        names.PushBack(JsonValue(("target " + std::to_string(names.Size() + 1)).c_str(), memory), memory);
    for (const ClipTarget& target : targets)
        names.PushBack(JsonValue(target.name.c_str(), memory), memory);
}

void GltfAmender::addTargets(std::size_t node, const std::vector<GltfPart>& parts, std::size_t known,
                             const std::vector<ClipTarget>& targets) {
    storage::JsonDocument& document = source_.document;
    JsonValue& mesh = ownMesh(node);
    // parts that share their vertices share the targets, too
    std::map<std::string, rapidjson::SizeType> partOf;
    JsonValue& primitives = mesh["primitives"];
    for (rapidjson::SizeType p = 0; p < primitives.Size(); ++p) {
        JsonValue& list = arrayMember(primitives[p], "targets", document);
        const std::string vertices = gltfText(primitives[p]["attributes"]) + gltfText(list);
        const auto [same, isNew] = partOf.try_emplace(vertices, p);
        for (std::size_t t = 0; t < targets.size(); ++t) {
            JsonValue target =
                isNew ? targetOf(parts[p], targets[t].shape)
                      : JsonValue(primitives[same->second]["targets"][sizeOf(known + t)], document.GetAllocator());
            list.PushBack(target, document.GetAllocator());
        }
    }
    lengthenWeights(mesh, known + targets.size(), document);
    lengthenWeights(nodeAt(document, node), known + targets.size(), document);
    nameTargets(mesh, known, targets);
}

void GltfAmender::beginAnimation(const std::string& name, const std::vector<float>& seconds) {
    auto& memory = source_.document.GetAllocator();
    times_ = add("SCALAR", 1, seconds, true);
    animation_.SetObject();
    animation_.AddMember("name", JsonValue(name.c_str(), memory), memory);
    animation_.AddMember("samplers", JsonValue(rapidjson::kArrayType), memory);
    animation_.AddMember("channels", JsonValue(rapidjson::kArrayType), memory);
}

void GltfAmender::addChannel(std::size_t node, const char* path, unsigned keys) {
    auto& memory = source_.document.GetAllocator();
    JsonValue sampler(rapidjson::kObjectType);
    sampler.AddMember("input", times_, memory);
    sampler.AddMember("output", keys, memory);
    sampler.AddMember("interpolation", "LINEAR", memory);
    animation_["samplers"].PushBack(sampler, memory);
    JsonValue target(rapidjson::kObjectType);
    target.AddMember("node", std::uint64_t{node}, memory);
    target.AddMember("path", rapidjson::StringRef(path), memory);
    JsonValue channel(rapidjson::kObjectType);
    channel.AddMember("sampler", animation_["samplers"].Size() - 1, memory);
    channel.AddMember("target", target, memory);
    animation_["channels"].PushBack(channel, memory);
}

void GltfAmender::addTrack(const GltfNodes& nodes, const JointTrack& track) {
    if (!track.isAnimated())
        return;
    const auto addPart = [&](const char* path, auto NodePose::*part, bool moves) {
        if (!moves)
            return;
        std::vector<float> keys;
        for (const NodePose& pose : track.poses)
            keys.insert(keys.end(), (pose.*part).begin(), (pose.*part).end());
        const std::size_t width = (track.poses.front().*part).size();
        addChannel(track.node, path, add(width == 4 ? "VEC4" : "VEC3", width, keys, false));
    };
    addPart("translation", &NodePose::translation, track.isTranslated);
    addPart("rotation", &NodePose::rotation, track.isRotated);
    addPart("scale", &NodePose::scale, track.isScaled);
    // what has keys is taken apart, as the keys are
    auto& memory = source_.document.GetAllocator();
    JsonValue& node = nodeAt(source_.document, track.node);
    const NodePose rest = poseOf(nodes.rest(track.node));
    for (const char* key : {"matrix", "translation", "rotation", "scale"})
        node.RemoveMember(key);
    node.AddMember("translation", list(rest.translation), memory);
    node.AddMember("rotation", list(rest.rotation), memory);
    node.AddMember("scale", list(rest.scale), memory);
}

void GltfAmender::addWeights(std::size_t node, const std::vector<float>& weights) {
    addChannel(node, "weights", add("SCALAR", 1, weights, false));
}

std::vector<std::string> GltfAmender::endAnimation(const std::set<std::size_t>& moved,
                                                   const std::set<std::size_t>& weighted) {
    storage::JsonDocument& document = source_.document;
    auto& memory = document.GetAllocator();
    std::vector<std::string> sentences;
    JsonValue all(rapidjson::kArrayType);
    all.PushBack(animation_, memory);
    std::size_t index = 0;
    for (JsonValue& animation : arrayMember(document, "animations", document).GetArray()) {
        const std::string name =
            "the animation \"" + textOf(animation, "name") + "\" (" + element("animations", index++) + ") ";
        JsonValue& channels = arrayMember(animation, "channels", document);
        const std::size_t before = channels.Size();
        for (auto channel = channels.Begin(); channel != channels.End();)
            channel = isFought(*channel, moved, weighted) ? channels.Erase(channel) : channel + 1;
        const std::size_t gone = before - channels.Size();
        if (gone > 0)
            sentences.push_back(name + (channels.Empty()
                                            ? "is replaced by the clip"
                                            : "keeps " + std::to_string(channels.Size()) + " of its " +
                                                  std::to_string(before) + " tracks: the clip moves the others"));
        if (!channels.Empty())
            all.PushBack(animation, memory);
    }
    document["animations"] = all;
    return sentences;
}

void GltfAmender::write(std::ostream& out) {
    auto& memory = source_.document.GetAllocator();
    JsonValue buffer(rapidjson::kObjectType);
    buffer.AddMember("byteLength", std::uint64_t{source_.binary.size() + numbers_.size()}, memory);
    JsonValue& buffers = arrayMember(source_.document, "buffers", source_.document);
    buffers.Clear();
    buffers.PushBack(buffer, memory);
    writeGlb(out, gltfText(source_.document), std::array<std::string_view, 2>{source_.binary, numbers_});
}

} // namespace quarn
