// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/skinnedGltf.h"

#include "quarn/scene/GltfVertices.h"
#include "quarn/scene/meshes.h"

#include <algorithm>
#include <limits>
#include <map>
#include <stdexcept>

namespace quarn {
namespace {

constexpr std::size_t setSize = 4;
using Shape = GltfNumbers::Shape;
using Use = GltfNumbers::Use;

// of a vertex: weights by joint, none of them 0, with the sum 1
std::map<std::size_t, double> influencesOf(const SceneSkin& skin, std::size_t vertex) {
    std::map<std::size_t, double> weights;
    double sum = 0.0;
    for (std::size_t i = skin.weights.first[vertex]; i < skin.weights.first[vertex + 1]; ++i) {
        const rig::Influence& influence = skin.weights.influences[i];
        weights[*skin.influences[influence.joint].joint] += influence.weight;
        sum += influence.weight;
    }
    for (auto& [joint, weight] : weights)
        weight = sum != 0.0 ? weight / sum : 0.0;
    return weights;
}

// influences of all vertices, four in each of the sets
struct InfluenceSets {
    std::vector<std::vector<std::uint16_t>> joints;
    std::vector<std::vector<float>> weights;
};

InfluenceSets setsOf(const SceneSkin& skin) {
    const std::size_t vertices = skin.weights.vertexCount();
    InfluenceSets sets;
    for (std::size_t vertex = 0; vertex < vertices; ++vertex) {
        std::size_t place = 0;
        for (const auto& [joint, weight] : influencesOf(skin, vertex)) {
            const std::size_t set = place / setSize;
            if (set == sets.joints.size()) {
                sets.joints.emplace_back(setSize * vertices, std::uint16_t{0});
                sets.weights.emplace_back(setSize * vertices, 0.0F);
            }
            sets.joints[set][setSize * vertex + place % setSize] = static_cast<std::uint16_t>(joint);
            sets.weights[set][setSize * vertex + place % setSize] = static_cast<float>(weight);
            ++place;
        }
    }
    return sets;
}

std::vector<float> inverseBindsOf(const SceneSkin& skin, const std::vector<HMatrix>& restWorlds) {
    std::vector<HMatrix> matrices;
    matrices.reserve(restWorlds.size());
    for (const HMatrix& world : restWorlds)
        matrices.push_back(world.inverse()); // the identity of a singular one: it moves nothing
    for (const SceneSkin::Influence& influence : skin.influences)
        matrices[*influence.joint] = influence.inverseBind;
    // column by column for column vectors is row by row for row vectors
    std::vector<float> numbers;
    numbers.reserve(16 * matrices.size());
    for (const HMatrix& matrix : matrices)
        for (unsigned row = 0; row < 4; ++row)
            for (unsigned column = 0; column < 4; ++column)
                numbers.push_back(static_cast<float>(matrix(row, column)));
    return numbers;
}

// positions of one vertex after the other, with zeros for those that stay
std::vector<float> denseDeltas(const rig::ShapeDeltas& deltas, std::size_t vertices) {
    std::vector<float> numbers(3 * vertices, 0.0F);
    for (std::size_t i = 0; i < deltas.xyz.size(); ++i)
        numbers[3 * std::size_t{deltas.vertices[i / 3]} + i % 3] = static_cast<float>(deltas.xyz[i]);
    return numbers;
}

// positions, texture coordinates and triangles
SkinnedGltf addMesh(const std::string& name, const HPlug& mesh, const GltfVertices& vertices, GltfNumbers& numbers) {
    std::vector<float> points;
    readPoints(mesh, points);
    if (points.empty() || vertices.triangles.empty())
        throw std::runtime_error("the mesh " + name + " has " + std::to_string(points.size() / 3) + " vertices and " +
                                 std::to_string(vertices.triangles.size() / 3) + " triangles");
    SkinnedGltf made;
    made.name = name;
    made.positions = numbers.add(vertices.withCopies<float>(points, 3), {Shape::vec3, Use::vertices, true});
    if (!vertices.uvs.empty())
        made.uvs = numbers.add(vertices.uvs, {Shape::vec2, Use::vertices});
    made.indices = numbers.add(vertices.triangles, {Shape::scalar, Use::indices});
    return made;
}

void addTargets(const SceneShapes& shapes, const GltfVertices& vertices, GltfNumbers& numbers, SkinnedGltf& made) {
    for (const SceneShapes::Shape& shape : shapes.shapes) {
        const std::vector<float> deltas = denseDeltas(shape.deltas, vertices.meshVertices);
        made.targets.push_back({shape.name,
                                numbers.add(vertices.withCopies<float>(deltas, 3), {Shape::vec3, Use::vertices, true}),
                                shape.restWeight});
    }
}

} // namespace

std::string whyNotInGltf(const SceneSkin& skin) {
    constexpr std::size_t mostJoints = std::numeric_limits<std::uint16_t>::max();
    for (std::size_t k = 0; k < skin.influences.size(); ++k) {
        const std::string matrix = skin.node + ".matrix[" + std::to_string(skin.weights.joints[k]) + "]";
        if (!skin.influences[k].joint)
            return "is moved by " + matrix + ", which comes from no joint";
        if (*skin.influences[k].joint > mostJoints)
            return "is moved by more joints than a glTF file can number";
    }
    return {};
}

SkinnedGltf addSkinned(const SceneSkin& skin, const SceneShapes* shapes, const std::vector<HMatrix>& restWorlds,
                       GltfNumbers& numbers) {
    const HPlug& mesh = shapes == nullptr ? skin.input : shapes->input;
    const GltfVertices vertices(polygonsOf(mesh));
    SkinnedGltf made = addMesh(skin.mesh, mesh, vertices, numbers);
    if (vertices.meshVertices != skin.weights.vertexCount())
        throw std::runtime_error("the mesh " + skin.mesh + " has " + std::to_string(vertices.meshVertices) +
                                 " vertices, and its skin " + skin.node + " has " +
                                 std::to_string(skin.weights.vertexCount()) + " vertices");
    if (shapes != nullptr)
        addTargets(*shapes, vertices, numbers, made);
    const InfluenceSets sets = setsOf(skin);
    for (std::size_t set = 0; set < sets.joints.size(); ++set)
        made.jointsAndWeights.emplace_back(
            numbers.add(vertices.withCopies<std::uint16_t>(sets.joints[set], setSize), {Shape::vec4, Use::vertices}),
            numbers.add(vertices.withCopies<float>(sets.weights[set], setSize), {Shape::vec4, Use::vertices}));
    made.inverseBinds = numbers.add(inverseBindsOf(skin, restWorlds), {Shape::mat4});
    return made;
}

SkinnedGltf addMorphed(const SceneShapes& shapes, GltfNumbers& numbers) {
    const GltfVertices vertices(polygonsOf(shapes.input));
    SkinnedGltf made = addMesh(shapes.mesh, shapes.input, vertices, numbers);
    addTargets(shapes, vertices, numbers, made);
    return made;
}

} // namespace quarn
