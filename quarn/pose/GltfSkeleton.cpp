// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: nodes, skins and animations.
#include "quarn/pose/GltfSkeleton.h"

#include "quarn/scene/gltfParts.h"

#include <algorithm>
#include <array>
#include <ostream>

namespace quarn {
namespace {

std::vector<double> listed(const HVector& vector) {
    return {vector.x, vector.y, vector.z};
}

std::vector<double> listed(const HQuaternion& rotation) {
    return {rotation.x, rotation.y, rotation.z, rotation.w};
}

void writeIndices(JsonWriter& json, const char* key, const std::vector<std::size_t>& indices) {
    json.Key(key);
    json.StartArray();
    for (const std::size_t index : indices)
        json.Uint64(index);
    json.EndArray();
}

void writeNumbers(JsonWriter& json, const char* key, const std::vector<double>& numbers) {
    json.Key(key);
    json.StartArray();
    for (const double number : numbers)
        json.Double(number);
    json.EndArray();
}

class Document {
public:
    explicit Document(const GltfSkeleton& skeleton)
        : skeleton_(skeleton) {}

    void write(std::ostream& out) const {
        rapidjson::StringBuffer buffer;
        JsonWriter json(buffer);
        json.SetFormatOptions(rapidjson::kFormatSingleLineArray);
        json.StartObject();
        writeGltfAsset(json);
        writeCount(json, "scene", 0);
        writeScenes(json);
        writeNodes(json);
        writeMeshes(json);
        writeAnimation(json);
        skeleton_.numbers.write(json);
        json.EndObject();
        writeGlb(out, buffer.GetString(), std::array{skeleton_.numbers.bytes()});
    }

private:
    std::vector<std::size_t> placedRoots() const {
        std::vector<std::size_t> roots;
        for (std::size_t j = 0; j < skeleton_.joints.size(); ++j)
            if (skeleton_.joints[j].joint.parent < 0 && skeleton_.joints[j].joint.space != HMatrix())
                roots.push_back(j);
        return roots;
    }

    std::vector<std::size_t> topmost() const {
        std::vector<std::size_t> nodes;
        for (std::size_t j = 0; j < skeleton_.joints.size(); ++j)
            if (skeleton_.joints[j].joint.parent < 0 && skeleton_.joints[j].joint.space == HMatrix())
                nodes.push_back(j);
        for (std::size_t i = 0; i < placedRoots().size(); ++i)
            nodes.push_back(skeleton_.joints.size() + i);
        for (std::size_t mesh = 0; mesh < skeleton_.meshes.size(); ++mesh)
            if (!skeleton_.meshes[mesh].inverseBinds)
                nodes.push_back(firstMeshNode() + mesh);
        return nodes;
    }

    std::size_t firstMeshNode() const { return skeleton_.joints.size() + placedRoots().size(); }

    void writeScenes(JsonWriter& json) const {
        std::vector<std::size_t> nodes = topmost();
        if (skeleton_.metersPerUnit != 1.0)
            nodes = {firstMeshNode() + skeleton_.meshes.size()};
        for (std::size_t mesh = 0; mesh < skeleton_.meshes.size(); ++mesh)
            if (skeleton_.meshes[mesh].inverseBinds)
                nodes.push_back(firstMeshNode() + mesh);
        json.Key("scenes");
        json.StartArray();
        json.StartObject();
        writeIndices(json, "nodes", nodes);
        json.EndObject();
        json.EndArray();
    }

    void writeNodes(JsonWriter& json) const {
        json.Key("nodes");
        json.StartArray();
        for (std::size_t j = 0; j < skeleton_.joints.size(); ++j)
            writeJoint(json, j);
        for (const std::size_t root : placedRoots())
            writeSpace(json, root);
        std::size_t skins = 0;
        for (std::size_t mesh = 0; mesh < skeleton_.meshes.size(); ++mesh) {
            json.StartObject();
            writeText(json, "name", skeleton_.meshes[mesh].name);
            writeCount(json, "mesh", mesh);
            if (skeleton_.meshes[mesh].inverseBinds)
                writeCount(json, "skin", skins++);
            json.EndObject();
        }
        if (skeleton_.metersPerUnit != 1.0) {
            json.StartObject();
            writeText(json, "name", "scene_unit");
            writeNumbers(json, "scale", {skeleton_.metersPerUnit, skeleton_.metersPerUnit, skeleton_.metersPerUnit});
            writeIndices(json, "children", topmost());
            json.EndObject();
        }
        json.EndArray();
    }

    void writeJoint(JsonWriter& json, std::size_t index) const {
        const GltfSkeleton::Node& joint = skeleton_.joints[index];
        std::vector<std::size_t> children;
        for (std::size_t j = index + 1; j < skeleton_.joints.size(); ++j)
            if (skeleton_.joints[j].joint.parent == static_cast<int>(index))
                children.push_back(j);
        json.StartObject();
        writeText(json, "name", joint.joint.name);
        writeNumbers(json, "translation", listed(joint.rest.translation));
        writeNumbers(json, "rotation", listed(joint.rest.rotation));
        writeNumbers(json, "scale", listed(joint.rest.scale));
        if (!children.empty())
            writeIndices(json, "children", children);
        json.EndObject();
    }

    // a root whose parentMatrix is set to something
    void writeSpace(JsonWriter& json, std::size_t root) const {
        std::vector<double> numbers;
        for (unsigned row = 0; row < 4; ++row)
            numbers.insert(numbers.end(), skeleton_.joints[root].joint.space[row],
                           skeleton_.joints[root].joint.space[row] + 4);
        json.StartObject();
        writeText(json, "name", skeleton_.joints[root].joint.name + "_space");
        writeNumbers(json, "matrix", numbers);
        writeIndices(json, "children", {root});
        json.EndObject();
    }

    void writeMeshes(JsonWriter& json) const {
        if (skeleton_.meshes.empty())
            return;
        json.Key("meshes");
        json.StartArray();
        for (const SkinnedGltf& mesh : skeleton_.meshes)
            writeMesh(json, mesh);
        json.EndArray();
        writeSkins(json);
    }

    void writeSkins(JsonWriter& json) const {
        const auto hasSkin = [](const SkinnedGltf& mesh) { return mesh.inverseBinds.has_value(); };
        if (std::none_of(skeleton_.meshes.begin(), skeleton_.meshes.end(), hasSkin))
            return;
        std::vector<std::size_t> all(skeleton_.joints.size());
        for (std::size_t j = 0; j < all.size(); ++j)
            all[j] = j;
        json.Key("skins");
        json.StartArray();
        for (const SkinnedGltf& mesh : skeleton_.meshes) {
            if (!mesh.inverseBinds)
                continue;
            json.StartObject();
            writeIndices(json, "joints", all);
            writeCount(json, "inverseBindMatrices", *mesh.inverseBinds);
            json.EndObject();
        }
        json.EndArray();
    }

    static void writeMesh(JsonWriter& json, const SkinnedGltf& mesh) {
        json.StartObject();
        writeText(json, "name", mesh.name);
        json.Key("primitives");
        json.StartArray();
        json.StartObject();
        json.Key("attributes");
        json.StartObject();
        writeCount(json, "POSITION", mesh.positions);
        if (mesh.uvs)
            writeCount(json, "TEXCOORD_0", *mesh.uvs);
        for (std::size_t set = 0; set < mesh.jointsAndWeights.size(); ++set) {
            writeCount(json, ("JOINTS_" + std::to_string(set)).c_str(), mesh.jointsAndWeights[set].first);
            writeCount(json, ("WEIGHTS_" + std::to_string(set)).c_str(), mesh.jointsAndWeights[set].second);
        }
        json.EndObject();
        writeCount(json, "indices", mesh.indices);
        if (!mesh.targets.empty())
            writeTargets(json, mesh);
        json.EndObject();
        json.EndArray();
        if (!mesh.targets.empty())
            writeWeights(json, mesh);
        json.EndObject();
    }

    // in the primitive
    static void writeTargets(JsonWriter& json, const SkinnedGltf& mesh) {
        json.Key("targets");
        json.StartArray();
        for (const SkinnedGltf::Target& target : mesh.targets) {
            json.StartObject();
            writeCount(json, "POSITION", target.positions);
            json.EndObject();
        }
        json.EndArray();
    }

    // in the mesh; where the names go is no part of glTF, and everybody's habit
    static void writeWeights(JsonWriter& json, const SkinnedGltf& mesh) {
        std::vector<double> weights;
        for (const SkinnedGltf::Target& target : mesh.targets)
            weights.push_back(target.restWeight);
        writeNumbers(json, "weights", weights);
        json.Key("extras");
        json.StartObject();
        json.Key("targetNames");
        json.StartArray();
        for (const SkinnedGltf::Target& target : mesh.targets)
            json.String(target.name.c_str());
        json.EndArray();
        json.EndObject();
    }

    // those of joints, and then those of weights
    std::vector<GltfSkeleton::Channel> channels() const {
        std::vector<GltfSkeleton::Channel> all = skeleton_.channels;
        for (std::size_t mesh = 0; mesh < skeleton_.meshes.size(); ++mesh)
            if (!skeleton_.meshes[mesh].targets.empty())
                all.push_back({firstMeshNode() + mesh, "weights", skeleton_.meshes[mesh].weightKeys});
        return all;
    }

    void writeAnimation(JsonWriter& json) const {
        const std::vector<GltfSkeleton::Channel> all = channels();
        json.Key("animations");
        json.StartArray();
        json.StartObject();
        writeText(json, "name", "poses");
        json.Key("samplers");
        json.StartArray();
        for (const GltfSkeleton::Channel& channel : all) {
            json.StartObject();
            writeCount(json, "input", skeleton_.times);
            writeCount(json, "output", channel.keys);
            writeText(json, "interpolation", "LINEAR");
            json.EndObject();
        }
        json.EndArray();
        json.Key("channels");
        json.StartArray();
        for (std::size_t i = 0; i < all.size(); ++i) {
            json.StartObject();
            writeCount(json, "sampler", i);
            json.Key("target");
            json.StartObject();
            writeCount(json, "node", all[i].node);
            writeText(json, "path", all[i].path);
            json.EndObject();
            json.EndObject();
        }
        json.EndArray();
        json.EndObject();
        json.EndArray();
    }

    const GltfSkeleton& skeleton_;
};

} // namespace

void writeSkeleton(std::ostream& out, const GltfSkeleton& skeleton) {
    Document(skeleton).write(out);
}

} // namespace quarn
