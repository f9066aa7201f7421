// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/characterFiles.h"

#include "quarn/character/readCharacter.h"
#include "support/TemporaryFolder.h"

#include <fstream>

namespace quarn {

std::vector<float> stripPoints() {
    return {0, 0, 0, 1, 0, 0, 1, 1, 0, 0, 1, 0, 1, 0, 0, 2, 0, 0, 2, 1, 0, 1, 1, 0};
}

std::vector<std::uint16_t> stripTriangles() {
    return {0, 1, 2, 0, 2, 3, 4, 5, 6, 4, 6, 7};
}

GltfWriter Strip::write() const {
    GltfWriter file;
    const float a = seam[0];
    const float b = seam[1];
    std::vector<std::uint16_t> joints;
    std::vector<float> weights;
    for (const float lowerWeight : {0.0F, a, a, 0.0F, b, 1.0F, 1.0F, b}) {
        joints.insert(joints.end(), {0, 1, 0, 0});
        weights.insert(weights.end(), {1.0F - lowerWeight, lowerWeight, 0.0F, 0.0F});
    }
    const std::size_t points = file.floats("VEC3", stripPoints());
    const std::size_t triangles = file.shorts("SCALAR", stripTriangles());
    const std::size_t jointIndices = file.shorts("VEC4", joints);
    const std::size_t jointWeights = file.floats("VEC4", weights);
    const std::size_t matrices = file.floats(
        "MAT4", {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, -1, 0, 0, 1});
    file.nodes = {upper, lower, mesh};
    file.roots = "0,2";
    file.meshes = {R"({"name":"armShape","primitives":[{"attributes":{"POSITION":)" + std::to_string(points) +
                   ",\"JOINTS_0\":" + std::to_string(jointIndices) + ",\"WEIGHTS_0\":" + std::to_string(jointWeights) +
                   "},\"indices\":" + std::to_string(triangles) + "}]}"};
    file.skins = {R"({"joints":[0,1],"inverseBindMatrices":)" + std::to_string(matrices) + "}"};
    more(file);
    return file;
}

Character readBytesAs(const std::string& name, const std::string& bytes) {
    const TemporaryFolder folder;
    const std::string path = (folder.path() / name).string();
    std::ofstream(path, std::ios::binary) << bytes;
    return readCharacter(path);
}

Character read(const GltfWriter& file) {
    return readBytesAs("character.gltf", file.text());
}

} // namespace quarn
