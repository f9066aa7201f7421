// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: 3.5 "Scenes". Its matrices are for column vectors and
// written column by column, which is row by row for row vectors.
#include "quarn/play/GltfNodes.h"

#include "openquarn/HQuaternion.h"
#include "openquarn/HTransformationMatrix.h"
#include "quarn/character/gltfJson.h"

#include <algorithm>
#include <cmath>

namespace quarn {
namespace {

template <std::size_t N>
void readNumbers(const JsonValue& node, const char* key, std::array<double, N>& numbers, std::size_t index) {
    const JsonValue* list = member(node, key);
    if (list == nullptr)
        return;
    bool isFine = list->IsArray() && list->Size() == N;
    for (rapidjson::SizeType i = 0; isFine && i < N; ++i) {
        isFine = (*list)[i].IsNumber() && std::isfinite((*list)[i].GetDouble());
        numbers.at(i) = isFine ? (*list)[i].GetDouble() : 0.0;
    }
    if (!isFine)
        throw std::runtime_error(element("nodes", index) + ": \"" + key + "\" is not " + std::to_string(N) +
                                 " finite numbers");
}

HMatrix matrixOf(const HVector& scale, const HQuaternion& rotation, const HVector& translation) {
    HMatrix matrix = rotation.asMatrix();
    matrix.setRow(0, matrix.row(0) * scale.x);
    matrix.setRow(1, matrix.row(1) * scale.y);
    matrix.setRow(2, matrix.row(2) * scale.z);
    matrix.setRow(3, translation);
    return matrix;
}

HMatrix restOf(const JsonValue& node, std::size_t index) {
    if (member(node, "matrix") != nullptr) {
        std::array<double, 16> numbers{};
        readNumbers(node, "matrix", numbers, index);
        HMatrix matrix;
        for (unsigned i = 0; i < 16; ++i)
            matrix(i / 4, i % 4) = i % 4 == 3 ? (i == 15 ? 1.0 : 0.0) : numbers.at(i);
        return matrix;
    }
    std::array<double, 3> translation{}, scale{1.0, 1.0, 1.0};
    std::array<double, 4> turn{0.0, 0.0, 0.0, 1.0};
    readNumbers(node, "translation", translation, index);
    readNumbers(node, "rotation", turn, index);
    readNumbers(node, "scale", scale, index);
    return matrixOf({scale[0], scale[1], scale[2]}, {turn[0], turn[1], turn[2], turn[3]},
                    {translation[0], translation[1], translation[2]});
}

std::vector<std::size_t> parentsOf(const JsonValue& nodes) {
    std::vector<std::size_t> parents(nodes.Size(), nodes.Size());
    std::size_t index = 0;
    for (const JsonValue& node : nodes.GetArray()) {
        for (const JsonValue& child : listOf(node, "children").GetArray())
            parents[child.GetUint()] = index;
        ++index;
    }
    return parents;
}

// the nodes are a forest
std::vector<std::size_t> parentsFirst(const std::vector<std::size_t>& parents) {
    std::vector<std::size_t> order;
    std::vector<bool> isThere(parents.size());
    for (std::size_t node = 0; node < parents.size(); ++node) {
        const auto begin = static_cast<std::ptrdiff_t>(order.size());
        for (std::size_t above = node; above != parents.size() && !isThere[above]; above = parents[above]) {
            order.push_back(above);
            isThere[above] = true;
        }
        std::reverse(order.begin() + begin, order.end());
    }
    return order;
}

} // namespace

HMatrix NodePose::matrix() const {
    const auto whole = [](float number) { return static_cast<double>(number); };
    return matrixOf({whole(scale[0]), whole(scale[1]), whole(scale[2])},
                    {whole(rotation[0]), whole(rotation[1]), whole(rotation[2]), whole(rotation[3])},
                    {whole(translation[0]), whole(translation[1]), whole(translation[2])});
}

NodePose poseOf(const HMatrix& matrix, const NodePose& like) {
    const HTransformationMatrix split(matrix);
    double scale[3] = {1.0, 1.0, 1.0};
    split.getScale(scale, HSpace::kTransform);
    HQuaternion turn = split.rotation();
    const HQuaternion other(static_cast<double>(like.rotation[0]), static_cast<double>(like.rotation[1]),
                            static_cast<double>(like.rotation[2]), static_cast<double>(like.rotation[3]));
    if (turn.dot(other) < 0.0)
        turn = -turn;
    const auto single = [](double number) { return static_cast<float>(number); };
    NodePose pose;
    pose.translation = {single(matrix(3, 0)), single(matrix(3, 1)), single(matrix(3, 2))};
    pose.rotation = {single(turn.x), single(turn.y), single(turn.z), single(turn.w)};
    pose.scale = {single(scale[0]), single(scale[1]), single(scale[2])};
    return pose;
}

GltfNodes::GltfNodes(const storage::JsonValue& document)
    : parents_(parentsOf(listOf(document, "nodes")))
    , order_(parentsFirst(parents_)) {
    for (const JsonValue& node : listOf(document, "nodes").GetArray())
        rests_.push_back(restOf(node, rests_.size()));
}

std::vector<HMatrix> GltfNodes::worlds(const std::vector<HMatrix>& locals) const {
    std::vector<HMatrix> worlds = locals;
    for (const std::size_t node : order_)
        if (parents_[node] != count())
            worlds[node] = locals[node] * worlds[parents_[node]];
    return worlds;
}

} // namespace quarn
