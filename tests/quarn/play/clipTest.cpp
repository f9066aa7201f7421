// SPDX-License-Identifier: Apache-2.0
// A motion in one glTF file, read back by another program: its base and weighted targets are every frame.
#include "quarn/play/FrameFiles.h"
#include "quarn/scene/vertexNormals.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <assimp/Importer.hpp>
#include <assimp/scene.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <random>

namespace {

using namespace quarn;
using ::testing::ElementsAre;
using ::testing::FloatNear;
using ::testing::HasSubstr;
using ::testing::Pointwise;

// a quad, a triangle, a vertex that nothing uses
const MeshPolygons polygons{6, {4, 3}, {0, 1, 2, 3, 4, 3, 2}};
const FrameRange frames{-3, 5, 2};

std::vector<std::vector<float>> anyMotion() {
    std::mt19937 random(11);
    std::uniform_real_distribution<float> place(-1.0F, 1.0F);
    std::vector<std::vector<float>> motion(frames.count(), std::vector<float>(3 * polygons.vertexCount));
    for (std::vector<float>& frame : motion)
        for (float& value : frame)
            value = place(random);
    return motion;
}

// what a program shows at a key of the animation: the base and the targets by their weights
std::vector<float> shown(const aiMesh& mesh, const aiMeshMorphKey& key, aiVector3D* aiMesh::*base,
                         aiVector3D* aiAnimMesh::*target) {
    std::vector<float> xyz;
    for (unsigned i = 0; i < 3 * mesh.mNumVertices; ++i) {
        const auto rest = static_cast<double>((mesh.*base)[i / 3][i % 3]);
        double value = rest;
        for (unsigned t = 0; t < key.mNumValuesAndWeights; ++t)
            value += key.mWeights[t] *
                     (static_cast<double>((mesh.mAnimMeshes[key.mValues[t]]->*target)[i / 3][i % 3]) - rest);
        xyz.push_back(static_cast<float>(value));
    }
    return xyz;
}

void writeFrames(const std::filesystem::path& path, const std::vector<std::vector<float>>& motion,
                 FrameWriting writing) {
    FrameFiles files(path, polygons, std::move(writing));
    for (std::size_t i = 0; i < motion.size(); ++i)
        files.add(frames.frame(i), motion[i]);
    files.finish();
}

TEST(Clip, IsEveryFrameToAnotherProgram) {
    const TemporaryFolder folder;
    const std::string path = folder.path() / "clip.glb";
    const auto motion = anyMotion();
    writeFrames(path, motion, {.frames = frames, .framesPerSecond = 25.0, .meshName = "hand", .metersPerUnit = 0.01});
    Assimp::Importer importer;
    const aiScene* scene = importer.ReadFile(path, 0);
    ASSERT_NE(scene, nullptr) << importer.GetErrorString();
    ASSERT_EQ(scene->mNumAnimations, 1U);
    ASSERT_EQ(scene->mAnimations[0]->mNumMorphMeshChannels, 1U);
    const aiMeshMorphAnim& channel = *scene->mAnimations[0]->mMorphMeshChannels[0];
    const aiMesh& mesh = *scene->mMeshes[0];
    ASSERT_EQ(channel.mNumKeys, motion.size());
    EXPECT_EQ(mesh.mNumFaces, 3U);
    EXPECT_EQ(std::string(mesh.mAnimMeshes[3]->mName.C_Str()), "frame 5");
    for (unsigned i = 0; i < channel.mNumKeys; ++i) {
        SCOPED_TRACE(i);
        const aiMeshMorphKey& key = channel.mKeys[i];
        EXPECT_NEAR(key.mTime, 1000.0 * (2 * i) / 25.0, 1e-3);
        EXPECT_THAT(shown(mesh, key, &aiMesh::mVertices, &aiAnimMesh::mVertices),
                    Pointwise(FloatNear(1e-6F), motion[i]));
        EXPECT_THAT(shown(mesh, key, &aiMesh::mNormals, &aiAnimMesh::mNormals),
                    Pointwise(FloatNear(1e-6F), vertexNormals(motion[i], polygons)));
    }
    aiVector3D scale, place;
    aiQuaternion turn;
    const aiNode* node = scene->mRootNode->FindNode("hand");
    ASSERT_NE(node, nullptr);
    node->mTransformation.Decompose(scale, turn, place);
    EXPECT_THAT((std::vector{scale.x, scale.y, scale.z}), Pointwise(FloatNear(1e-8F), {0.01F, 0.01F, 0.01F}));
}

TEST(Clip, IsWrittenForSeveralFramesWithoutANumber) {
    EXPECT_TRUE(isAnimatedFile("a.glb", 2));
    EXPECT_FALSE(isAnimatedFile("a.glb", 1)) << "a still";
    EXPECT_FALSE(isAnimatedFile("a.#.glb", 2));
    EXPECT_TRUE(isAnimatedFile("a.usda", 1));
    EXPECT_FALSE(isAnimatedFile("a.gltf", 2));
    const TemporaryFolder folder;
    EXPECT_THAT(failureOf([&] {
                    FrameFiles(folder.path() / "a.glb", {3, {2}, {0, 1}}, {.frames = {1, 2, 1}});
                }),
                HasSubstr("a.glb: glTF has no meshes without triangles"));
    EXPECT_THAT(failureOf([&] {
                    FrameFiles(folder.path() / "a.glb", {6, {3}, {0, 1, 2}}, {.frames = {1, 40000, 1}});
                }),
                HasSubstr("a.glb would have 6.4 GB, and a .glb has room for 4"));
    EXPECT_TRUE(std::filesystem::is_empty(folder.path()));
}

TEST(VertexNormals, AreWeighedByArea) {
    // a large square in the plane of x and y, and a small triangle on its edge that stands upright
    const std::vector<float> xyz{0, 0, 0, 2, 0, 0, 2, 2, 0, 0, 2, 0, 2, 0, 1, 9, 9, 9};
    const std::vector<float> normals = vertexNormals(xyz, {6, {4, 3}, {0, 1, 2, 3, 1, 4, 2}});
    EXPECT_THAT(std::vector(normals.begin(), normals.begin() + 3), ElementsAre(0, 0, 1));
    const float length = std::sqrt(8.0F * 8.0F + 2.0F * 2.0F); // twice the areas
    EXPECT_THAT(std::vector(normals.begin() + 3, normals.begin() + 6),
                Pointwise(FloatNear(1e-6F), {-2.0F / length, 0.0F, 8.0F / length}));
    EXPECT_THAT(std::vector(normals.end() - 3, normals.end()), ElementsAre(0, 1, 0));
}

} // namespace
