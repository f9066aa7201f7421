// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/skinBinding.h"

#include <algorithm>
#include <cmath>
#include <unordered_map>

namespace quarn {
namespace {

// matrices of files are in single precision, and here products of several
constexpr double rounding = 1e-5;

double extent(const std::vector<HPoint>& points) {
    double largest = 0.0;
    for (const HPoint& point : points)
        largest = std::max({largest, std::abs(point.x), std::abs(point.y), std::abs(point.z)});
    return largest;
}

// whether two matrices bring points that are `size` away to the same place, up to rounding
bool sameWithin(const HMatrix& a, const HMatrix& b, double size) {
    double length = 0.0; // of what is added up for a point: sizes before and after may be in different units
    double largest = 0.0;
    for (unsigned column = 0; column < 3; ++column)
        for (unsigned row = 0; row < 4; ++row) {
            const double factor = row < 3 ? size : 1.0;
            largest = std::max(largest, std::abs(a(row, column) - b(row, column)) * factor);
            length = std::max({length, std::abs(a(row, column)) * factor, std::abs(b(row, column)) * factor});
        }
    return largest <= rounding * length;
}

bool isSingular(const HMatrix& matrix) {
    HStatus status;
    matrix.inverse(&status);
    return status.error();
}

// where the first joint, which has no other above it, has the mesh at rest
HMatrix spaceOfScene(const CharacterMesh& mesh, const RestWorlds& worlds) {
    if (mesh.bindings.empty())
        return mesh.worldTransform;
    const Binding& first = mesh.bindings.front();
    const HMatrix place = first.inverseBind * worlds.file[first.joint];
    return isSingular(place) || sameWithin(place, HMatrix(), extent(mesh.points)) ? HMatrix() : place;
}

// what binds to the scene's joint and brings points of the scene to where the file has them at rest
HMatrix boundInScene(const Binding& binding, const HMatrix& fromScene, const RestWorlds& worlds) {
    const HMatrix inverseBind = fromScene * binding.inverseBind;
    const HMatrix& scene = worlds.scene[binding.joint];
    if (scene.isEquivalent(worlds.file[binding.joint]) || isSingular(scene))
        return inverseBind;
    return inverseBind * worlds.file[binding.joint] * scene.inverse();
}

void listInfluences(const CharacterMesh& mesh, SkinBinding& bound) {
    std::unordered_map<std::uint32_t, double> placeOf;
    for (std::size_t k = 0; k < mesh.bindings.size(); ++k)
        placeOf[mesh.bindings[k].joint] = static_cast<double>(k);
    bound.counts.reserve(mesh.influences.size());
    for (const std::vector<Influence>& influences : mesh.influences) {
        bound.counts.push_back(static_cast<double>(influences.size()));
        for (const Influence& influence : influences) {
            bound.influences.push_back(placeOf.at(influence.joint));
            bound.weights.push_back(influence.weight);
        }
    }
}

void bindToJoints(const CharacterMesh& mesh, const RestWorlds& worlds, SkinBinding& bound) {
    const HMatrix fromScene = bound.toScene.inverse();
    const double size = extent(mesh.points);
    bound.joints.reserve(mesh.bindings.size());
    for (const Binding& binding : mesh.bindings) {
        bound.joints.push_back({binding.joint, boundInScene(binding, fromScene, worlds)});
        const bool stays = sameWithin(binding.inverseBind * worlds.file[binding.joint], bound.toScene, size);
        if (!stays && bound.movedAtRest < 0)
            bound.movedAtRest = static_cast<int>(binding.joint);
    }
    listInfluences(mesh, bound);
}

void bindToParent(const CharacterMesh& mesh, const RestWorlds& worlds, SkinBinding& bound) {
    const auto joint = static_cast<std::uint32_t>(mesh.parentJoint);
    bound.joints = {{joint, worlds.scene[joint].inverse()}};
    bound.counts.assign(mesh.points.size(), 1.0);
    bound.influences.assign(mesh.points.size(), 0.0);
    bound.weights.assign(mesh.points.size(), 1.0);
}

} // namespace

SkinBinding bindMesh(const CharacterMesh& mesh, const RestWorlds& worlds) {
    SkinBinding bound;
    bound.toScene = spaceOfScene(mesh, worlds);
    if (!mesh.bindings.empty())
        bindToJoints(mesh, worlds, bound);
    else if (mesh.parentJoint >= 0 && !isSingular(worlds.scene[static_cast<std::size_t>(mesh.parentJoint)]))
        bindToParent(mesh, worlds, bound);
    return bound;
}

} // namespace quarn
