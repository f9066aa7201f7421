// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/cornerUvs.h"

#include <bit>
#include <cmath>
#include <unordered_map>

namespace quarn {
namespace {

// as one number; -0 is 0
std::uint64_t bitsOf(float u, float v) {
    const auto bits = [](float value) { return std::uint64_t{std::bit_cast<std::uint32_t>(value + 0.0F)}; };
    return bits(u) << 32U | bits(v);
}

} // namespace

std::size_t appendUvs(const aiMesh& part, CharacterMesh& mesh) {
    const aiVector3D* uvs = part.mTextureCoords[0];
    if (uvs == nullptr && mesh.uvs.empty())
        return 0;
    std::size_t unusable = 0;
    mesh.uvs.resize(2 * (mesh.points.size() - part.mNumVertices), 0.0F); // of the parts before
    for (unsigned vertex = 0; vertex < part.mNumVertices; ++vertex) {
        const aiVector3D uv = uvs == nullptr ? aiVector3D() : uvs[vertex];
        const bool isUsable = std::isfinite(uv.x) && std::isfinite(uv.y);
        unusable += isUsable ? 0U : 1U;
        mesh.uvs.insert(mesh.uvs.end(), {isUsable ? uv.x : 0.0F, isUsable ? uv.y : 0.0F});
    }
    return unusable;
}

void takeCornerUvs(CharacterMesh& mesh) {
    if (!mesh.uvs.empty())
        mesh.cornerUvs = mesh.corners;
}

void joinUvs(CharacterMesh& mesh) {
    std::unordered_map<std::uint64_t, std::uint32_t> places;
    std::vector<float> joined;
    for (std::uint32_t& corner : mesh.cornerUvs) {
        const float u = mesh.uvs[2 * std::size_t{corner}];
        const float v = mesh.uvs[2 * std::size_t{corner} + 1];
        const auto [place, isNew] = places.try_emplace(bitsOf(u, v), static_cast<std::uint32_t>(joined.size() / 2));
        if (isNew)
            joined.insert(joined.end(), {u, v});
        corner = place->second;
    }
    mesh.uvs = std::move(joined);
}

} // namespace quarn
