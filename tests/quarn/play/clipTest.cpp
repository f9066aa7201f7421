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

#include <algorithm>
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

TEST(Clip, IsEveryFrameToAnotherProgram) {
    const TemporaryFolder folder;
    const std::string path = folder.path() / "clip.glb";
    const auto motion = anyMotion();
    FrameWriting writing;
    writing.frames = frames;
    writing.framesPerSecond = 25.0;
    writing.meshName = "hand";
    writing.metersPerUnit = 0.01;
    FrameFiles files(path, polygons, writing);
    for (std::size_t i = 0; i < motion.size(); ++i)
        files.add(frames.frame(i), motion[i]);
    files.finish();
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

// what is read of a motion of so many frames that was fitted, in millimetres; and the weights
struct Fitted {
    std::size_t shapes = 0;
    double told = 0.0, error = 0.0;
    std::vector<double> weights;
};

Fitted fitted(const std::vector<std::vector<float>>& motion, double allowed) {
    const TemporaryFolder folder;
    const std::string path = folder.path() / "clip.glb";
    FrameWriting writing;
    writing.frames.last = static_cast<int>(motion.size());
    writing.metersPerUnit = 0.1;
    writing.allowedError = allowed;
    FrameFiles files(path, polygons, writing);
    for (std::size_t i = 0; i < motion.size(); ++i)
        files.add(static_cast<int>(i) + 1, motion[i]);
    files.finish();
    Assimp::Importer importer;
    const aiScene* scene = importer.ReadFile(path, 0);
    const aiMeshMorphAnim& channel = *scene->mAnimations[0]->mMorphMeshChannels[0];
    Fitted result{scene->mMeshes[0]->mNumAnimMeshes, files.shapes()->error, 0.0, {}};
    EXPECT_EQ(files.shapes()->count, result.shapes);
    for (std::size_t i = 0; i < motion.size(); ++i) {
        const aiMeshMorphKey& key = channel.mKeys[i];
        result.weights.insert(result.weights.end(), key.mWeights, key.mWeights + key.mNumValuesAndWeights);
        const auto xyz = shown(*scene->mMeshes[0], key, &aiMesh::mVertices, &aiAnimMesh::mVertices);
        for (std::size_t v = 0; v < xyz.size(); v += 3)
            result.error =
                std::max(result.error, 100.0 * std::hypot(xyz[v] - motion[i][v], xyz[v + 1] - motion[i][v + 1],
                                                          xyz[v + 2] - motion[i][v + 2]));
    }
    return result;
}

TEST(Clip, HasAsFewShapesAsTheErrorAllows) {
    std::mt19937 random(5);
    std::normal_distribution<float> any;
    const auto direction = [&] {
        std::vector<float> xyz(3 * polygons.vertexCount);
        std::generate(xyz.begin(), xyz.end(), [&] { return any(random); });
        return xyz;
    };
    const std::vector<float> rest = direction(), swing = direction(), slide = direction();
    std::vector<std::vector<float>> motion;
    for (int frame = 0; frame < 30; ++frame) {
        const auto time = static_cast<float>(frame);
        motion.push_back(direction()); // a tremble
        for (std::size_t i = 0; i < rest.size(); ++i)
            motion.back()[i] = rest[i] + std::sin(time) * swing[i] + 0.1F * time * slide[i] + 1e-4F * motion.back()[i];
    }
    const Fitted two = fitted(motion, 0.2);
    EXPECT_EQ(two.shapes, 2U);
    EXPECT_NEAR(two.told, two.error, 1e-4);
    EXPECT_LE(two.error, 0.2);
    for (std::size_t shape = 0; shape < 2; ++shape) {
        std::vector<double> weights;
        for (std::size_t i = shape; i < two.weights.size(); i += 2)
            weights.push_back(two.weights[i]);
        EXPECT_EQ(*std::min_element(weights.begin(), weights.end()), 0.0);
        EXPECT_EQ(*std::max_element(weights.begin(), weights.end()), 1.0);
    }
    const Fitted more = fitted(motion, 0.01);
    EXPECT_GT(more.shapes, 2U);
    EXPECT_LE(more.error, 0.01);
    EXPECT_THAT(failureOf([&] { fitted(motion, 1e-9); }), HasSubstr("by rounding alone, and --error is 1e-09"));
    EXPECT_EQ(fitted({3, rest}, 0.01).shapes, 1U)
        << "what stands still, as glTF has no mesh with an empty list of them";
}

TEST(Clip, IsWrittenForSeveralFramesWithoutANumber) {
    EXPECT_TRUE(isAnimatedFile("a.glb", 2));
    EXPECT_FALSE(isAnimatedFile("a.glb", 1)) << "a still";
    EXPECT_FALSE(isAnimatedFile("a.#.glb", 2));
    EXPECT_TRUE(isAnimatedFile("a.usda", 1));
    EXPECT_FALSE(isAnimatedFile("a.gltf", 2));
    const TemporaryFolder folder;
    const auto refusal = [&](const MeshPolygons& mesh, int last) {
        FrameWriting writing;
        writing.frames.last = last;
        return failureOf([&] { FrameFiles(folder.path() / "a.glb", mesh, writing); });
    };
    EXPECT_THAT(refusal({3, {2}, {0, 1}}, 2), HasSubstr("a.glb: glTF has no meshes without triangles"));
    EXPECT_THAT(refusal({6, {3}, {0, 1, 2}}, 40000), HasSubstr("a.glb would have 6.4 GB, and a .glb has room for 4"));
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
