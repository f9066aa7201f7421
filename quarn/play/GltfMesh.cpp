// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: 3.7 "Geometry", skins and morph targets.
#include "quarn/play/GltfMesh.h"

#include "quarn/character/gltfTypes.h"
#include "quarn/character/gltfValues.h"
#include "storage/finite.h"

#include <algorithm>

namespace quarn {
namespace {

const JsonValue& at(const JsonValue& document, const char* list, const JsonValue& index) {
    return listOf(document, list)[index.GetUint()];
}

// the numbers of an attribute; of one that is not there none
std::vector<float> numbersOf(const JsonValue& document, const JsonValue& attributes, const char* name,
                             GltfBytes& bytes) {
    const JsonValue* accessor = member(attributes, name);
    if (!indexOf(accessor, listOf(document, "accessors").Size(), "accessors", name))
        return {};
    std::vector<float> numbers = floatValues(document, accessor->GetUint(), bytes);
    if (storage::firstNotFinite(numbers))
        throw std::runtime_error(std::string("its ") + name + " has a number that is not finite");
    return numbers;
}

// of so many vertices; zeros where there are none
void append(std::vector<float>& all, const std::vector<float>& part, std::size_t vertices, const char* name) {
    if (!part.empty() && part.size() != 3 * vertices)
        throw std::runtime_error(std::string("its ") + name + " has " + std::to_string(part.size()) + " numbers for " +
                                 std::to_string(vertices) + " vertices");
    all.insert(all.end(), part.begin(), part.end());
    all.resize(all.size() + (part.empty() ? 3 * vertices : 0));
}

void addWeighted(std::vector<float>& numbers, const std::vector<float>& deltas, float weight) {
    std::transform(numbers.begin(), numbers.end(), deltas.begin(), numbers.begin(),
                   [&](float number, float delta) { return number + weight * delta; });
}

HMatrix matrixAt(const std::vector<float>& numbers, std::size_t index) {
    HMatrix matrix;
    for (unsigned i = 0; i < 16; ++i)
        if (i % 4 != 3)
            matrix(i / 4, i % 4) = static_cast<double>(numbers[16 * index + i]);
    return matrix;
}

} // namespace

GltfMesh::GltfMesh(const JsonValue& document, std::size_t node, GltfBytes& bytes)
    : node_(node) {
    const JsonValue& shows = listOf(document, "nodes")[static_cast<rapidjson::SizeType>(node)];
    const JsonValue& mesh = at(document, "meshes", *member(shows, "mesh"));
    const JsonValue* skin = member(shows, "skin");
    isSkinned_ = skin != nullptr;
    if (isSkinned_)
        readSkin(document, at(document, "skins", *skin), bytes);
    for (const JsonValue& primitive : listOf(mesh, "primitives").GetArray())
        addPart(document, primitive, bytes);
}

void GltfMesh::addPart(const JsonValue& document, const JsonValue& primitive, GltfBytes& bytes) {
    if (extensionOf(primitive, dracoExtension) != nullptr)
        throw std::runtime_error("it is compressed by Draco");
    const JsonValue& attributes = primitive["attributes"];
    const std::vector<float> points = numbersOf(document, attributes, "POSITION", bytes);
    const std::vector<float> normals = numbersOf(document, attributes, "NORMAL", bytes);
    const GltfPart part{vertexCount(), points.size() / 3, !normals.empty()};
    append(base_.points, points, part.count, "POSITION");
    append(base_.normals, normals, part.count, "NORMAL");
    addTargets(document, primitive, part, bytes);
    if (isSkinned_)
        addInfluences(document, primitive, bytes);
    influences_.resize(isSkinned_ ? vertexCount() : 0);
    parts_.push_back(part);
}

void GltfMesh::addTargets(const JsonValue& document, const JsonValue& primitive, const GltfPart& part,
                          GltfBytes& bytes) {
    const JsonValue& targets = listOf(primitive, "targets");
    targets_.resize(targets.Size());
    for (rapidjson::SizeType t = 0; t < targets.Size(); ++t) {
        append(targets_[t].points, numbersOf(document, targets[t], "POSITION", bytes), part.count, "POSITION");
        append(targets_[t].normals, numbersOf(document, targets[t], "NORMAL", bytes), part.count, "NORMAL");
    }
}

void GltfMesh::addInfluences(const JsonValue& document, const JsonValue& primitive, GltfBytes& bytes) {
    const std::size_t first = influences_.size();
    influences_.resize(vertexCount());
    const JsonValue& attributes = primitive["attributes"];
    for (unsigned set = 0;; ++set) {
        const std::string number = std::to_string(set);
        const std::vector<float> joints = numbersOf(document, attributes, ("JOINTS_" + number).c_str(), bytes);
        const std::vector<float> weights = numbersOf(document, attributes, ("WEIGHTS_" + number).c_str(), bytes);
        if (joints.empty())
            break;
        for (std::size_t i = 0; i < joints.size(); ++i)
            if (const auto joint = static_cast<std::size_t>(joints[i]); weights[i] != 0.0F && joint < joints_.size())
                influences_[first + i / 4].push_back({joint, static_cast<double>(weights[i])});
    }
    for (std::size_t vertex = first; vertex < influences_.size(); ++vertex) {
        double sum = 0.0;
        for (const Influence& influence : influences_[vertex])
            sum += influence.weight;
        for (Influence& influence : influences_[vertex])
            influence.weight = sum != 0.0 ? influence.weight / sum : 0.0;
    }
}

void GltfMesh::readSkin(const JsonValue& document, const JsonValue& skin, GltfBytes& bytes) {
    for (const JsonValue& joint : listOf(skin, "joints").GetArray())
        joints_.push_back(joint.GetUint());
    inverseBinds_.resize(joints_.size());
    const std::vector<float> numbers = numbersOf(document, skin, "inverseBindMatrices", bytes);
    for (std::size_t joint = 0; 16 * joint < numbers.size() && joint < joints_.size(); ++joint)
        inverseBinds_[joint] = matrixAt(numbers, joint);
}

bool GltfMesh::hasNormals() const {
    return std::any_of(parts_.begin(), parts_.end(), [](const GltfPart& part) { return part.hasNormals; });
}

ClipShape GltfMesh::morphed(std::span<const float> weights) const {
    ClipShape shape = base_;
    for (std::size_t t = 0; t < targets_.size(); ++t) {
        addWeighted(shape.points, targets_[t].points, weights[t]);
        addWeighted(shape.normals, targets_[t].normals, weights[t]);
    }
    return shape;
}

std::vector<HMatrix> GltfMesh::blended(const std::vector<HMatrix>& worlds) const {
    if (!isSkinned_)
        return std::vector<HMatrix>(vertexCount(), worlds[node_]);
    std::vector<HMatrix> moves;
    for (std::size_t joint = 0; joint < joints_.size(); ++joint)
        moves.push_back(inverseBinds_[joint] * worlds[joints_[joint]]);
    std::vector<HMatrix> blended;
    blended.reserve(influences_.size());
    for (const std::vector<Influence>& influences : influences_) {
        HMatrix sum = HMatrix() * 0.0;
        for (const Influence& influence : influences)
            sum = sum + moves[influence.joint] * influence.weight;
        sum(3, 3) = 1.0;
        blended.push_back(sum);
    }
    return blended;
}

} // namespace quarn
