// SPDX-License-Identifier: Apache-2.0
// Texture coordinates are those of the file at every corner, whatever becomes of the vertices.
#include "quarn/character/characterFiles.h"
#include "quarn/character/joinVertices.h"
#include "support/failureOf.h"

#include <assimp/Exporter.hpp>
#include <assimp/Importer.hpp>
#include <gmock/gmock.h>

#include <algorithm>
#include <array>
#include <limits>

namespace quarn {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

using Corner = std::array<float, 4>; // x and y, u and v

// of the strip's vertices, v down, in whole numbers: at one end of the seam the halves agree
const std::vector<int> wholeUvs = {0, 3, 1, 3, 1, 2, 0, 2, 1, 3, 2, 3, 2, 2, 3, 0};

std::vector<float> uvsDividedBy(float divisor) {
    std::vector<float> uvs;
    for (const int whole : wholeUvs)
        uvs.push_back(static_cast<float>(whole) / divisor);
    return uvs;
}

Strip stripWith(std::function<std::size_t(GltfWriter&)> uvs) {
    Strip strip;
    strip.more = [uvs = std::move(uvs)](GltfWriter& file) {
        const std::string attribute = "\"TEXCOORD_0\":" + std::to_string(uvs(file)) + ",";
        file.meshes[0].insert(file.meshes[0].find("\"JOINTS_0\""), attribute);
    };
    return strip;
}

std::vector<Corner> sorted(std::vector<Corner> corners) {
    std::sort(corners.begin(), corners.end());
    return corners;
}

std::vector<Corner> cornersOf(const CharacterMesh& mesh) {
    std::vector<Corner> corners;
    for (std::size_t i = 0; i < mesh.cornerUvs.size(); ++i) {
        const HPoint& point = mesh.points[mesh.corners[i]];
        const float* uv = mesh.uvs.data() + std::size_t{2} * mesh.cornerUvs[i];
        corners.push_back({static_cast<float>(point.x), static_cast<float>(point.y), uv[0], uv[1]});
    }
    return sorted(corners);
}

std::vector<Corner> wantedCorners(const std::vector<float>& uvs) {
    std::vector<Corner> corners;
    for (const std::uint16_t vertex : stripTriangles())
        corners.push_back({stripPoints()[3U * vertex], stripPoints()[3U * vertex + 1], uvs[2U * vertex],
                           1.0F - uvs[2U * vertex + 1]});
    return sorted(corners);
}

TEST(Uvs, OfAGltfFileHoweverTheyAreStored) {
    const struct {
        float divisor;
        std::function<std::size_t(GltfWriter&)> write;
    } rows[] = {
        {4.0F, [](GltfWriter& file) { return file.floats("VEC2", uvsDividedBy(4.0F)); }},
        {3.0F,
         [](GltfWriter& file) {
             std::vector<std::uint16_t> shorts;
             for (const int whole : wholeUvs)
                 shorts.push_back(static_cast<std::uint16_t>(21845 * whole));
             return file.values("VEC2", 5123, shorts, ",\"normalized\":true");
         }},
        {1.0F,
         [](GltfWriter& file) {
             return file.values("VEC2", 5120, std::vector<std::int8_t>(wholeUvs.begin(), wholeUvs.end()));
         }},
    };
    for (const auto& row : rows) {
        const Character character = read(stripWith(row.write).write());
        const CharacterMesh& mesh = character.meshes.at(0);
        EXPECT_EQ(cornersOf(mesh), wantedCorners(uvsDividedBy(row.divisor)));
        EXPECT_EQ(mesh.points.size(), 6U) << "a seam in the picture is none in the surface";
        EXPECT_EQ(mesh.uvs.size(), 2U * 7U);
    }
    EXPECT_THAT(read(Strip().write()).meshes[0].uvs, testing::IsEmpty());
}

TEST(Uvs, OfOtherFormats) {
    const std::string strip =
        stripWith([](GltfWriter& file) { return file.floats("VEC2", uvsDividedBy(4.0F)); }).write().text();
    Assimp::Importer importer;
    const aiScene* scene = importer.ReadFileFromMemory(strip.data(), strip.size(), 0, "gltf");
    ASSERT_NE(scene, nullptr);
    const std::pair<const char*, const char*> rows[] = {{"collada", "strip.dae"}, {"fbxa", "text.fbx"}};
    for (const auto& [format, file] : rows) {
        Assimp::Exporter exporter;
        const aiExportDataBlob* blob = exporter.ExportToBlob(scene, format);
        ASSERT_NE(blob, nullptr) << exporter.GetErrorString();
        const Character character = readBytesAs(file, {static_cast<const char*>(blob->data), blob->size});
        EXPECT_EQ(cornersOf(character.meshes.at(0)), wantedCorners(uvsDividedBy(4.0F))) << file;
        EXPECT_EQ(character.meshes[0].points.size(), 6U) << file;
    }
}

// a polygon that goes, and one that loses a corner in its middle and one at its end
TEST(Uvs, FollowTheCornersThatStay) {
    CharacterMesh mesh;
    mesh.points = {{0, 0, 0}, {0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 0, 0}};
    mesh.influences.resize(mesh.points.size());
    mesh.polygonSizes = {3, 3, 5};
    mesh.corners = {0, 1, 2, 1, 2, 3, 0, 1, 2, 3, 4};
    for (std::uint32_t corner = 0; corner < mesh.corners.size(); ++corner)
        mesh.cornerUvs.push_back(corner);
    EXPECT_EQ(joinVertices(mesh), 1U);
    EXPECT_THAT(mesh.corners, ElementsAre(0, 1, 2, 0, 1, 2));
    EXPECT_THAT(mesh.cornerUvs, ElementsAre(3, 4, 5, 6, 8, 9));
}

TEST(Uvs, OnesThatAreMissingOrWrong) {
    auto uvs = uvsDividedBy(4.0F);
    uvs[10] = std::numeric_limits<float>::quiet_NaN();
    Strip strip = stripWith([&](GltfWriter& file) { return file.floats("VEC2", uvs); });
    const auto addUvs = strip.more;
    strip.more = [&](GltfWriter& file) {
        addUvs(file);
        std::string& mesh = file.meshes[0]; // the same surface once more, in front and without any
        mesh.insert(mesh.find("[{") + 1, R"({"attributes":{"POSITION":0,"JOINTS_0":2,"WEIGHTS_0":3},"indices":1},)");
    };
    const Character character = read(strip.write());
    EXPECT_THAT(character.warnings, ElementsAre("the mesh \"arm\" has 1 texture coordinates that are not finite; they "
                                                "are 0"));
    uvs[10] = uvs[11] = 0.0F;
    std::vector<Corner> wanted = wantedCorners(uvs);
    for (Corner& corner : wanted)
        if (corner[0] == 2.0F && corner[1] == 0.0F)
            corner[3] = 0.0F; // as the file's own zero would not be
    for (Corner corner : wantedCorners(uvs))
        wanted.push_back({corner[0], corner[1], 0.0F, 0.0F});
    EXPECT_EQ(cornersOf(character.meshes.at(0)), sorted(wanted));

    const auto failure = [](const std::function<std::size_t(GltfWriter&)>& write) {
        return failureOf([&] { read(stripWith(write).write()); });
    };
    EXPECT_THAT(failure([](GltfWriter& file) { return file.floats("VEC2", std::vector<float>(14)); }),
                HasSubstr("TEXCOORD_0 has 7 values for 8 positions"));
    EXPECT_THAT(failure([](GltfWriter& file) { return file.floats("VEC3", std::vector<float>(24)); }),
                HasSubstr("does not hold texture coordinates by twos"));
}

} // namespace
} // namespace quarn
