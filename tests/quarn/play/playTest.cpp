// SPDX-License-Identifier: Apache-2.0
// Statistics against a plain computation, and files read back.
#include "quarn/play/FrameFiles.h"
#include "quarn/play/VertexOrder.h"
#include "quarn/play/meshFiles.h"
#include "quarn/scene/Distances.h"
#include "storage/PointCache.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <assimp/Importer.hpp>
#include <assimp/scene.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <fstream>
#include <random>
#include <sstream>

namespace {

using namespace quarn;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

// two at the same place, one that no polygon uses, a quad and a triangle
const std::vector<float> points{0, 0, 0, 1, 0, 0, 1, 1, 0.1F, 0, 1, 0, 0, 0, 0, 2e-8F, -3, 4};
const MeshPolygons polygons{6, {4, 3}, {0, 1, 2, 3, 4, 3, 2}};

TEST(Distances, AgreeWithAPlainComputation) {
    std::mt19937 random(7);
    std::lognormal_distribution<float> size(-3.0F, 2.0F);
    Distances distances;
    std::vector<double> all;
    for (int frame = 0; frame < 50; ++frame) {
        std::vector<float> a(300);
        const std::vector<float> b(300);
        for (float& value : a)
            value = size(random);
        for (std::size_t i = 0; i < a.size(); i += 3)
            all.push_back(
                std::hypot(static_cast<double>(a[i]), static_cast<double>(a[i + 1]), static_cast<double>(a[i + 2])));
        distances.add(frame, a, b);
    }
    const auto largest = std::max_element(all.begin(), all.end()) - all.begin();
    EXPECT_EQ(distances.worstFrame(), largest / 100);
    EXPECT_EQ(distances.worstVertex(), static_cast<std::size_t>(largest % 100));
    double sum = 0.0;
    for (const double distance : all)
        sum += distance;
    EXPECT_NEAR(distances.mean(), sum / 5000.0, 1e-12);
    std::sort(all.begin(), all.end());
    for (const double part : {0.01, 0.5, 0.99, 0.9999, 1.0}) {
        const double exact = all[static_cast<std::size_t>(std::ceil(part * 5000.0)) - 1];
        EXPECT_GE(distances.percentile(part), exact * (1.0 - 1e-7)) << part; // bins are of single precision
        EXPECT_LE(distances.percentile(part), exact * (1.0 + 1.0 / 1024.0)) << part;
    }
    EXPECT_EQ(distances.percentile(1.0), distances.largest());
}

TEST(Distances, OfEqualMeshesAreNought) {
    Distances distances;
    EXPECT_EQ(distances.percentile(0.5), 0.0);
    distances.add(3, points, points);
    EXPECT_EQ(distances.percentile(0.99), 0.0);
    EXPECT_EQ(distances.largest(), 0.0);
    EXPECT_EQ(distances.worstFrame(), 3);
}

TEST(Jitter, IsTheLargestSecondDifference) {
    Jitter jitter;
    for (const float x : {0.0F, 1.0F, 2.0F}) // steady motion does not tremble
        jitter.add(std::vector<float>{x, 0, 0, -x, 2 * x, 0});
    EXPECT_EQ(jitter.largest(), 0.0);
    jitter.add(std::vector<float>{3, 0, 0, -3, 9, 4});
    EXPECT_EQ(jitter.largest(), 5.0);
}

TEST(MeshFiles, ObjKeepsVerticesAndPolygons) {
    std::stringstream file;
    writeObj(file, points, polygons);
    std::vector<float> read;
    std::vector<std::string> faces;
    for (std::string line; std::getline(file, line);) {
        std::istringstream words(line.substr(2));
        if (line[0] == 'f')
            faces.push_back(words.str());
        else
            for (std::string word; words >> word;)
                read.push_back(std::stof(word));
    }
    EXPECT_EQ(read, points);
    EXPECT_THAT(faces, ElementsAre("1 2 3 4", "5 4 3"));
}

TEST(MeshFiles, PlyAndGltfAreReadByAnotherProgram) {
    const TemporaryFolder folder;
    for (const char* ending : {"ply", "gltf", "glb"}) {
        const auto path = folder.path() / (std::string("mesh.") + ending);
        writeMeshFile(path, points, polygons);
        Assimp::Importer importer;
        const aiScene* scene = importer.ReadFile(path.string(), 0);
        ASSERT_NE(scene, nullptr) << ending << ": " << importer.GetErrorString();
        const aiMesh& mesh = *scene->mMeshes[0];
        ASSERT_EQ(mesh.mNumVertices, 6U) << ending;
        for (unsigned i = 0; i < 18; ++i)
            EXPECT_EQ(mesh.mVertices[i / 3][i % 3], points[i]) << ending;
        const bool keepsQuads = std::string(ending) == "ply";
        ASSERT_EQ(mesh.mNumFaces, keepsQuads ? 2U : 3U);
        const aiFace& last = mesh.mFaces[mesh.mNumFaces - 1];
        EXPECT_THAT(std::vector<unsigned>(last.mIndices, last.mIndices + last.mNumIndices), ElementsAre(4, 3, 2));
    }
    std::ostringstream gltf; // the box, which that program does not look at
    writeGltf(gltf, std::vector<float>{1, 2, -3, 4, 5, -6, 1, 5, -3}, {3, {3}, {0, 1, 2}}, false);
    std::string text = gltf.str();
    std::erase_if(text, [](char c) { return c == ' ' || c == '\n'; });
    EXPECT_THAT(text, HasSubstr(R"("min":[1.0,2.0,-6.0],"max":[4.0,5.0,-3.0])"));
}

TEST(VertexOrder, WritesEveryVertexOfTheFile) {
    VertexOrder order({2, 0, 1, 0}, 3);
    EXPECT_THAT(order.points(std::vector<float>{0, 0, 0, 1, 1, 1, 2, 2, 2}),
                ElementsAre(2, 2, 2, 0, 0, 0, 1, 1, 1, 0, 0, 0));
    EXPECT_THAT(order.polygons({3, {3}, {0, 1, 2}}).corners, ElementsAre(1, 2, 0));
    EXPECT_THAT(failureOf([] { VertexOrder({0, 3}, 3); }), HasSubstr("from vertex 1 to 3, and the mesh has 3"));
    EXPECT_THAT(failureOf([] {
                    static_cast<void>(VertexOrder({0, 1}, 3).polygons({3, {3}, {0, 1, 2}}));
                }),
                HasSubstr("vertex 2 of the scene"));
}

// y of the scene is z of the file, and its unit a hundredth
TEST(FrameFiles, AreWrittenInTheSpaceThatIsAskedFor) {
    const TemporaryFolder folder;
    const FrameWriting writing{VertexOrder({1, 0}, 2), {"z", 0.01}, {3, 7, 4}, 25.0};
    const std::vector<float> xyz{1, 2, 3, 4, 5, 6};
    for (const char* name : {"cache.npy", "cache.npz", "cache.pc2", "cache.mdd"}) {
        SCOPED_TRACE(name);
        const std::string path = folder.path() / name;
        FrameFiles files(path, {2, {2}, {0, 1}}, writing);
        files.add(3, xyz);
        files.add(7, std::vector<float>(6));
        files.finish();
        const auto cache = storage::openPointCache(path);
        ASSERT_EQ(cache->frameCount(), 2U);
        std::vector<double> read(6);
        cache->read(0, 0, read);
        EXPECT_THAT(read, ElementsAre(400, -600, 500, 100, -300, 200));
        EXPECT_EQ(cache->firstFrame().value_or(3.0), 3.0);
        EXPECT_EQ(cache->frameStep().value_or(4.0), 4.0);
        EXPECT_NEAR(cache->secondsOf(1).value_or(0.28), 0.28, 1e-6);
    }
    FrameFiles files(folder.path() / "#.obj", {2, {2}, {0, 1}}, {{}, {"y", 1e-39}, {1, 1, 1}});
    EXPECT_THAT(failureOf([&] { files.add(1, xyz); }), HasSubstr("vertex 0 is too far away"));
}

} // namespace
