// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: nodes, skins and animations. A node is scale * rotation *
// translation for row vectors, as a joint is.
#include "quarn/pose/gltfPoses.h"

#include "quarn/pose/skinnedGltf.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/units.h"

#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

using Shape = GltfNumbers::Shape;

// one joint of the file
struct GltfJoint {
    SceneJoint joint;
    JointPose rest;
    std::vector<JointPose> poses;
};

HMatrix matrixOf(const JointPose& pose) {
    HMatrix matrix = pose.rotation.asMatrix();
    const double scale[3] = {pose.scale.x, pose.scale.y, pose.scale.z};
    for (unsigned axis = 0; axis < 3; ++axis)
        matrix.setRow(axis, matrix.row(axis) * scale[axis]);
    matrix.setRow(3, pose.translation);
    return matrix;
}

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

// a track of the animation: which part of which joint, and the accessor of its keys
struct Channel {
    std::size_t node = 0;
    const char* path = "";
    std::size_t keys = 0;
};

class PosesFile {
public:
    PosesFile(const Motion& motion, const FilePlaces& places)
        : motion_(motion)
        , places_(places)
        , unit_(metersPerUnit()) {
        if (motion.joints.empty())
            throw std::runtime_error(
                "the scene has no joints: .glb holds poses of a skeleton, .json those of any plugs");
        for (const SceneJoint& joint : motion.joints)
            addJoint(joint);
        addKeys();
        addMeshes();
    }

    void write(std::ostream& out) const {
        rapidjson::StringBuffer buffer;
        JsonWriter json(buffer);
        json.SetFormatOptions(rapidjson::kFormatSingleLineArray);
        json.StartObject();
        json.Key("asset");
        json.StartObject();
        writeText(json, "version", "2.0");
        writeText(json, "generator", "quarn " QUARN_VERSION);
        json.EndObject();
        writeCount(json, "scene", 0);
        writeScenes(json);
        writeNodes(json);
        writeMeshes(json);
        writeAnimation(json);
        numbers_.write(json);
        json.EndObject();
        writeGlb(out, buffer.GetString(), numbers_.bytes());
    }

    GltfPosesAnswer answer() const { return {meshes_.size(), notes_}; }

private:
    void addJoint(const SceneJoint& joint) {
        if (joint.held)
            throw std::runtime_error("the joint " + joint.name + " hangs below " + *joint.held +
                                     ", which is no joint: a file of a skeleton cannot say where that goes");
        std::vector<JointPose> poses = posesOf(motion_, joint);
        JointPose rest = restOf(joint, poses);
        HMatrix world = matrixOf(rest) * joint.space;
        if (joint.parent >= 0)
            world = matrixOf(rest) * restWorlds_[static_cast<std::size_t>(joint.parent)];
        restWorlds_.push_back(world);
        joints_.push_back({joint, rest, std::move(poses)});
    }

    void addKeys() {
        std::vector<float> seconds;
        for (std::size_t number = 0; number < motion_.frames.count(); ++number)
            seconds.push_back(static_cast<float>(places_.seconds(motion_.frames.frame(number))));
        times_ = numbers_.add(seconds, {Shape::scalar, GltfNumbers::Use::plain, true});
        for (std::size_t j = 0; j < joints_.size(); ++j) {
            addChannel(j, "translation", Shape::vec3, &JointPose::translation);
            addChannel(j, "rotation", Shape::vec4, &JointPose::rotation);
            addChannel(j, "scale", Shape::vec3, &JointPose::scale);
        }
    }

    template <class Part>
    void addChannel(std::size_t index, const char* path, Shape shape, Part JointPose::*part) {
        const GltfJoint& joint = joints_[index];
        const std::vector<double> rest = listed(joint.rest.*part);
        bool moves = index == 0 && shape == Shape::vec4; // an animation has at least one
        std::vector<float> keys;
        keys.reserve(rest.size() * joint.poses.size());
        for (const JointPose& pose : joint.poses) {
            const std::vector<double> now = listed(pose.*part);
            for (std::size_t i = 0; i < now.size(); ++i) {
                constexpr double rounding = 1e-9; // of taking a rest matrix apart
                moves = moves || std::abs(now[i] - rest[i]) > rounding * (1.0 + std::abs(rest[i]));
                keys.push_back(static_cast<float>(now[i]));
            }
        }
        if (moves)
            channels_.push_back({index, path, numbers_.add(keys, {shape})});
    }

    void addMeshes() {
        for (const SceneSkin& skin : sceneSkins(motion_.joints)) {
            if (const std::string why = whyNotInGltf(skin); !why.empty()) {
                notes_.push_back("the mesh " + skin.mesh + " " + why + ", and is left out");
                continue;
            }
            if (nodeType(skin.input.source().node()) != "mesh")
                notes_.push_back(std::string(skin.input.source().name().asChar()) +
                                 " is in the file as it is now: what moves it before its skin is left out");
            meshes_.push_back(addSkinned(skin, restWorlds_, numbers_));
        }
        if (meshes_.empty())
            notes_.emplace_back("no mesh is in the file, and quarn import needs one");
    }

    // --- the document: joints, then nodes above roots, then meshes, then the one above all ---

    std::vector<std::size_t> placedRoots() const {
        std::vector<std::size_t> roots;
        for (std::size_t j = 0; j < joints_.size(); ++j)
            if (joints_[j].joint.parent < 0 && joints_[j].joint.space != HMatrix())
                roots.push_back(j);
        return roots;
    }

    std::vector<std::size_t> topmost() const {
        std::vector<std::size_t> nodes;
        for (std::size_t j = 0; j < joints_.size(); ++j)
            if (joints_[j].joint.parent < 0 && joints_[j].joint.space == HMatrix())
                nodes.push_back(j);
        for (std::size_t i = 0; i < placedRoots().size(); ++i)
            nodes.push_back(joints_.size() + i);
        return nodes;
    }

    std::size_t firstMeshNode() const { return joints_.size() + placedRoots().size(); }

    void writeScenes(JsonWriter& json) const {
        std::vector<std::size_t> nodes = topmost();
        if (unit_ != 1.0)
            nodes = {firstMeshNode() + meshes_.size()};
        for (std::size_t mesh = 0; mesh < meshes_.size(); ++mesh)
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
        for (std::size_t j = 0; j < joints_.size(); ++j)
            writeJoint(json, j);
        for (const std::size_t root : placedRoots())
            writeSpace(json, root);
        for (std::size_t mesh = 0; mesh < meshes_.size(); ++mesh) {
            json.StartObject();
            writeText(json, "name", meshes_[mesh].name);
            writeCount(json, "mesh", mesh);
            writeCount(json, "skin", mesh);
            json.EndObject();
        }
        if (unit_ != 1.0) {
            json.StartObject();
            writeText(json, "name", "scene_unit");
            writeNumbers(json, "scale", {unit_, unit_, unit_});
            writeIndices(json, "children", topmost());
            json.EndObject();
        }
        json.EndArray();
    }

    void writeJoint(JsonWriter& json, std::size_t index) const {
        const GltfJoint& joint = joints_[index];
        std::vector<std::size_t> children;
        for (std::size_t j = index + 1; j < joints_.size(); ++j)
            if (joints_[j].joint.parent == static_cast<int>(index))
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
            numbers.insert(numbers.end(), joints_[root].joint.space[row], joints_[root].joint.space[row] + 4);
        json.StartObject();
        writeText(json, "name", joints_[root].joint.name + "_space");
        writeNumbers(json, "matrix", numbers);
        writeIndices(json, "children", {root});
        json.EndObject();
    }

    void writeMeshes(JsonWriter& json) const {
        if (meshes_.empty())
            return;
        json.Key("meshes");
        json.StartArray();
        for (const SkinnedGltf& mesh : meshes_)
            writeMesh(json, mesh);
        json.EndArray();
        std::vector<std::size_t> all(joints_.size());
        for (std::size_t j = 0; j < all.size(); ++j)
            all[j] = j;
        json.Key("skins");
        json.StartArray();
        for (const SkinnedGltf& mesh : meshes_) {
            json.StartObject();
            writeIndices(json, "joints", all);
            writeCount(json, "inverseBindMatrices", mesh.inverseBinds);
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
        for (std::size_t set = 0; set < mesh.jointsAndWeights.size(); ++set) {
            writeCount(json, ("JOINTS_" + std::to_string(set)).c_str(), mesh.jointsAndWeights[set].first);
            writeCount(json, ("WEIGHTS_" + std::to_string(set)).c_str(), mesh.jointsAndWeights[set].second);
        }
        json.EndObject();
        writeCount(json, "indices", mesh.indices);
        json.EndObject();
        json.EndArray();
        json.EndObject();
    }

    void writeAnimation(JsonWriter& json) const {
        json.Key("animations");
        json.StartArray();
        json.StartObject();
        writeText(json, "name", "poses");
        json.Key("samplers");
        json.StartArray();
        for (const Channel& channel : channels_) {
            json.StartObject();
            writeCount(json, "input", times_);
            writeCount(json, "output", channel.keys);
            writeText(json, "interpolation", "LINEAR");
            json.EndObject();
        }
        json.EndArray();
        json.Key("channels");
        json.StartArray();
        for (std::size_t i = 0; i < channels_.size(); ++i) {
            json.StartObject();
            writeCount(json, "sampler", i);
            json.Key("target");
            json.StartObject();
            writeCount(json, "node", channels_[i].node);
            writeText(json, "path", channels_[i].path);
            json.EndObject();
            json.EndObject();
        }
        json.EndArray();
        json.EndObject();
        json.EndArray();
    }

    const Motion& motion_;
    FilePlaces places_;
    double unit_;
    GltfNumbers numbers_;
    std::vector<GltfJoint> joints_;
    std::vector<HMatrix> restWorlds_;
    std::size_t times_ = 0;
    std::vector<Channel> channels_;
    std::vector<SkinnedGltf> meshes_;
    std::vector<std::string> notes_;
};

} // namespace

GltfPosesAnswer writeGltfPoses(std::ostream& out, const Motion& motion, const FilePlaces& places) {
    const PosesFile file(motion, places);
    file.write(out);
    return file.answer();
}

} // namespace quarn
