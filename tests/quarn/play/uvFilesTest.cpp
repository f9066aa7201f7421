// SPDX-License-Identifier: Apache-2.0
// Texture coordinates in files, read by another program: the same at every corner, seams included.
#include "quarn/play/FrameFiles.h"
#include "storage/framePattern.h"
#include "support/TemporaryFolder.h"

#include <assimp/Importer.hpp>
#include <assimp/scene.h>
#include <gmock/gmock.h>

#include <algorithm>
#include <array>

namespace {

using namespace quarn;

// a quad and a triangle with two common vertices, of which one lies at a seam; a vertex that nothing uses
const std::vector<float> points{0, 0, 0, 1, 0, 0, 1, 1, 0, 0, 1, 0, 2, 1, 0, 9, 9, 9};
const MeshPolygons polygons{6,
                            {4, 3},
                            {0, 1, 2, 3, 4, 3, 2},
                            {0, 0, 1, 0, 1, 0.75F, 0, 0.75F, 0.25F, 0.5F, 0.5F, 0.125F},
                            {0, 1, 2, 3, 4, 5, 2}};

using Corner = std::array<float, 5>; // x, y, z, u, v

std::vector<std::array<Corner, 3>> fan(const std::vector<Corner>& polygon) {
    std::vector<std::array<Corner, 3>> triangles;
    for (std::size_t i = 2; i < polygon.size(); ++i)
        triangles.push_back({polygon[0], polygon[i - 1], polygon[i]});
    return triangles;
}

std::vector<std::array<Corner, 3>> wantedTriangles() {
    std::vector<std::array<Corner, 3>> triangles;
    std::size_t corner = 0;
    for (const std::uint32_t size : polygons.sizes) {
        std::vector<Corner> polygon;
        for (std::uint32_t i = 0; i < size; ++i, ++corner) {
            const float* point = points.data() + std::size_t{3} * polygons.corners[corner];
            const float* uv = polygons.uvs.data() + std::size_t{2} * polygons.uvCorners[corner];
            polygon.push_back({point[0], point[1], point[2], uv[0], uv[1]});
        }
        for (const auto& triangle : fan(polygon))
            triangles.push_back(triangle);
    }
    return triangles;
}

std::vector<std::array<Corner, 3>> trianglesOf(const aiMesh& mesh) {
    std::vector<std::array<Corner, 3>> triangles;
    for (unsigned f = 0; f < mesh.mNumFaces; ++f) {
        std::vector<Corner> polygon;
        for (unsigned i = 0; i < mesh.mFaces[f].mNumIndices; ++i) {
            const aiVector3D& point = mesh.mVertices[mesh.mFaces[f].mIndices[i]];
            const aiVector3D& uv = mesh.mTextureCoords[0][mesh.mFaces[f].mIndices[i]];
            polygon.push_back({point.x, point.y, point.z, uv.x, uv.y});
        }
        for (const auto& triangle : fan(polygon))
            triangles.push_back(triangle);
    }
    return triangles;
}

TEST(UvFiles, AreTheSameAtEveryCorner) {
    const TemporaryFolder folder;
    std::vector<float> moved = points;
    for (float& value : moved)
        value += 0.5F;
    for (const char* name : {"frame.##.obj", "frame.##.gltf", "frame.##.glb", "clip.glb"}) {
        SCOPED_TRACE(name);
        FrameWriting writing;
        writing.frames = {1, 2, 1};
        FrameFiles files(folder.path() / name, polygons, writing);
        files.add(1, points);
        files.add(2, moved);
        files.finish();
        Assimp::Importer importer;
        const aiScene* scene = importer.ReadFile(storage::frameFile(folder.path() / name, 1).string(), 0);
        ASSERT_NE(scene, nullptr) << importer.GetErrorString();
        const aiMesh& mesh = *scene->mMeshes[0];
        ASSERT_TRUE(mesh.HasTextureCoords(0));
        EXPECT_EQ(trianglesOf(mesh), wantedTriangles());
        if (name[0] == 'f' && std::string(name).ends_with("obj"))
            continue;
        ASSERT_EQ(mesh.mNumVertices, 7U) << "one more";
        EXPECT_EQ(mesh.mVertices[6], mesh.mVertices[3]);
        if (mesh.mNumAnimMeshes > 0) {
            EXPECT_EQ(mesh.mNormals[6], mesh.mNormals[3]);
            EXPECT_EQ(mesh.mAnimMeshes[0]->mVertices[6], aiVector3D(0.5F, 1.5F, 0.5F));
        }
    }
}

} // namespace
