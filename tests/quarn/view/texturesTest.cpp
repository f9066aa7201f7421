// SPDX-License-Identifier: Apache-2.0
// What a page shows on a character is what its file has, the right way up, and a file that is none of the best costs a
// note.
#include "quarn/view/textures.h"
#include "quarn/character/GltfWriter.h"
#include "quarn/import/importCharacter.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/plugs.h"
#include "support/TemporaryFolder.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <fstream>
#include <random>

#define STB_IMAGE_IMPLEMENTATION
#define STB_IMAGE_STATIC
#include <stb_image.h>
#define STB_IMAGE_WRITE_IMPLEMENTATION
#define STB_IMAGE_WRITE_STATIC
#include <stb_image_write.h>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

struct Pixels {
    int width = 0, height = 0, channels = 0;
    std::vector<unsigned char> values;
    std::array<int, 3> at(int x, int y) const {
        const unsigned char* pixel =
            &values[static_cast<std::size_t>(channels) * static_cast<std::size_t>(y * width + x)];
        return {pixel[0], pixel[1], pixel[2]};
    }
};

std::string written(const Pixels& pixels, bool isJpeg = false) {
    std::string bytes;
    const auto append = [](void* to, void* from, int size) {
        static_cast<std::string*>(to)->append(static_cast<const char*>(from), static_cast<std::size_t>(size));
    };
    if (isJpeg)
        stbi_write_jpg_to_func(append, &bytes, pixels.width, pixels.height, pixels.channels, pixels.values.data(), 90);
    else
        stbi_write_png_to_func(append, &bytes, pixels.width, pixels.height, pixels.channels, pixels.values.data(), 0);
    return bytes;
}

Pixels read(const PageTexture& texture) {
    Pixels pixels;
    unsigned char* values = stbi_load_from_memory(reinterpret_cast<const unsigned char*>(texture.bytes.data()),
                                                  static_cast<int>(texture.bytes.size()), &pixels.width, &pixels.height,
                                                  &pixels.channels, 0);
    if (values != nullptr)
        pixels.values.assign(values, values + std::ptrdiff_t{pixels.width} * pixels.height * pixels.channels);
    stbi_image_free(values);
    return pixels;
}

// red and green above, blue and white below
Pixels quarters() {
    return {2, 2, 3, {255, 0, 0, 0, 255, 0, 0, 0, 255, 255, 255, 255}};
}

// noise that is smooth enough for JPEG, or of one colour where the alpha is what counts
Pixels clouds(int width, int height, int channels) {
    Pixels pixels{width, height, channels, {}};
    std::mt19937 random(2);
    for (int i = 0; i < width * height * channels; ++i)
        pixels.values.push_back(
            static_cast<unsigned char>(100 + i / channels % width / 4 + static_cast<int>(random() % 8)));
    return pixels;
}

/// Squares in a row along x, each of two triangles and a part of the mesh, each with all of the texture.
struct Card {
    std::vector<int> materials{0};
    std::string image = R"({"bufferView":VIEW})"; ///< VIEW stands for that of `picture`
    std::string picture = written(quarters());
    std::string lists = R"("materials":[{"pbrMetallicRoughness":{"baseColorTexture":{"index":0}}}],)"
                        R"("textures":[{"source":0}])";
    int mode = 4;
    bool isTorn = false; ///< with a triangle more, of no area

    std::string glb() const {
        GltfWriter file;
        std::string primitives;
        for (std::size_t i = 0; i < materials.size(); ++i) {
            const auto x = static_cast<float>(i);
            const std::size_t points = file.floats("VEC3", {x, 0, 0, x + 1, 0, 0, x, 1, 0, x + 1, 1, 0});
            const std::size_t uvs = file.floats("VEC2", {0, 1, 1, 1, 0, 0, 1, 0});
            using Corners = std::vector<std::uint16_t>;
            const Corners corners = mode == 5 ? Corners{0, 1, 2, 3}
                                    : isTorn  ? Corners{1, 1, 2, 0, 1, 2, 2, 1, 3}
                                              : Corners{0, 1, 2, 2, 1, 3};
            const std::size_t indices = file.shorts("SCALAR", corners);
            primitives += (i == 0 ? R"({"attributes":{"POSITION":)" : R"(,{"attributes":{"POSITION":)") +
                          std::to_string(points) + ",\"TEXCOORD_0\":" + std::to_string(uvs) +
                          "},\"indices\":" + std::to_string(indices) + ",\"mode\":" + std::to_string(mode) +
                          (materials[i] < 0 ? "" : ",\"material\":" + std::to_string(materials[i])) + "}";
        }
        file.nodes = {R"({"name":"card","mesh":0})"};
        file.meshes = {R"({"primitives":[)" + primitives + "]}"};
        std::string images = image;
        if (const std::size_t at = images.find("VIEW"); at != std::string::npos)
            images.replace(at, 4, std::to_string(file.view(picture)));
        file.more = "," + lists + ",\"images\":[" + images + "]";
        return file.binary();
    }
};

class TexturesTest : public testing::Test {
protected:
    TexturesTest() { ::setenv("NEURALWARP_PLUGIN", NW_PLUGIN, 1); }

    fs::path path(const std::string& name) const { return folder_.path() / name; }

    PageTextures gather(const Card& card, std::uint32_t size = 1024) {
        std::ofstream(path("card.glb"), std::ios::binary) << card.glb();
        ImportOptions options;
        options.file = path("card.glb");
        options.output = path("scene.json");
        importCharacter(options);
        beforeGathering();
        SceneSession session;
        session.open(path("scene.json"));
        const HObject mesh = findNode("card");
        polygons_ = polygonsOf(plugOf(mesh, "outMesh"));
        return gatherTextures(mesh, polygons_, size);
    }

    void expectNote(const Card& card, const std::string& note) {
        const PageTextures made = gather(card);
        EXPECT_THAT(made.textures, IsEmpty()) << note;
        EXPECT_THAT(made.materials, IsEmpty()) << note;
        ASSERT_EQ(made.notes.size(), 1U) << note;
        EXPECT_THAT(made.notes[0], HasSubstr(note));
        EXPECT_THAT(made.notes[0], HasSubstr("card.glb"));
    }

    std::function<void()> beforeGathering = [] {};
    MeshPolygons polygons_;

private:
    TemporaryFolder folder_;
};

TEST_F(TexturesTest, PicturesAreHadFromWhereverTheyLieAndTheRightWayUp) {
    std::ofstream(path("my skin.png"), std::ios::binary) << written(quarters());
    for (const std::string& image :
         {std::string(R"({"bufferView":VIEW,"mimeType":"image/png"})"), std::string(R"({"uri":"my%20skin.png"})"),
          std::string(R"({"uri":"./my skin.png"})")}) {
        Card card;
        card.image = image;
        const PageTextures made = gather(card);
        EXPECT_THAT(made.notes, IsEmpty()) << image;
        ASSERT_EQ(made.textures.size(), 1U) << image;
        EXPECT_EQ(made.textures[0].mime, "image/png");
        EXPECT_EQ(made.textures[0].bytes, card.picture);
        ASSERT_EQ(made.materials.size(), 1U);
        EXPECT_EQ(made.materials[0].triangles, 2U);
        EXPECT_EQ(made.materials[0].texture, 0);
        // the square's upper left corner is red, and so on: v is up, rows of a picture go down
        const Pixels picture = read(made.textures[0]);
        for (std::size_t corner = 0; corner < polygons_.corners.size(); ++corner) {
            const std::uint32_t vertex = polygons_.corners[corner];
            const float* uv = &polygons_.uvs[2 * std::size_t{polygons_.uvCorners[corner]}];
            EXPECT_EQ(picture.at(uv[0] > 0.5F ? 1 : 0, uv[1] > 0.5F ? 0 : 1),
                      quarters().at(static_cast<int>(vertex % 2), vertex < 2 ? 1 : 0));
        }
    }
}

TEST_F(TexturesTest, PolygonsHaveTheMaterialsOfTheirParts) {
    Card card;
    card.materials = {1, -1, 0, 2};
    card.isTorn = true;
    card.lists = R"("materials":[{"pbrMetallicRoughness":{"baseColorTexture":{"index":1},)"
                 R"("baseColorFactor":[0.5,0.25,1,1]}},{"alphaMode":"MASK",)"
                 R"("pbrMetallicRoughness":{"baseColorTexture":{"index":0}}},)"
                 R"({"pbrMetallicRoughness":{"baseColorFactor":[0.1,0.2,7,1],"baseColorTexture":{"index":1}}}],)"
                 R"("textures":[{"source":1},{"source":0}])";
    card.image = R"({"bufferView":VIEW},{"uri":"leaf.png"})";
    std::ofstream(path("leaf.png"), std::ios::binary) << written(clouds(8, 8, 4));
    const PageTextures made = gather(card);
    EXPECT_THAT(made.notes, IsEmpty());
    ASSERT_EQ(made.textures.size(), 2U);
    EXPECT_EQ(read(made.textures[0]).channels, 4);
    ASSERT_EQ(made.materials.size(), 4U);
    const std::array<int, 4> textures{0, -1, 1, 1};
    for (std::uint32_t i = 0; i < 4; ++i) {
        EXPECT_EQ(made.materials[i].firstTriangle, 2 * i);
        EXPECT_EQ(made.materials[i].triangles, 2U);
        EXPECT_EQ(made.materials[i].texture, textures[i]);
        EXPECT_EQ(made.materials[i].isCutOut, i == 0);
    }
    EXPECT_THAT(made.materials[2].colour, ElementsAre(0.5F, 0.25F, 1.0F));
    EXPECT_THAT(made.materials[3].colour, ElementsAre(0.1F, 0.2F, 1.0F));
}

TEST_F(TexturesTest, OneMaterialNeedsNoComparison) {
    Card card;
    card.mode = 5; // a strip
    card.materials = {0, 0};
    EXPECT_EQ(gather(card).materials.at(0).triangles, 4U);
    card.materials = {0, -1};
    expectNote(card, "which polygons of card have which material cannot be told");
}

TEST_F(TexturesTest, PicturesAreMadeSmallAndKeepTheirAlpha) {
    const std::string masked = R"("materials":[{"alphaMode":"MASK","pbrMetallicRoughness":)"
                               R"({"baseColorTexture":{"index":0}}}],"textures":[{"source":0}])";
    const struct {
        int width, height, channels;
        bool isJpeg, isMasked;
        std::uint32_t wide, high;
        int expected; ///< channels
        std::string mime;
    } rows[] = {
        {300, 100, 3, false, false, 64, 21, 3, "image/jpeg"}, {300, 100, 4, false, true, 64, 21, 4, "image/png"},
        {10, 400, 4, false, false, 2, 64, 3, "image/png"},    {400, 1, 1, true, false, 64, 1, 3, "image/png"},
        {64, 64, 3, true, false, 64, 64, 3, "image/jpeg"},    {64, 64, 4, false, false, 64, 64, 3, "image/jpeg"},
        {64, 64, 4, false, true, 64, 64, 4, "image/png"},     {8, 8, 4, false, false, 8, 8, 3, "image/png"}};
    for (const auto& row : rows) {
        Card card;
        card.picture = written(clouds(row.width, row.height, row.channels), row.isJpeg);
        card.lists = row.isMasked ? masked : card.lists;
        const PageTextures made = gather(card, 64);
        const std::string where = std::to_string(row.width) + " x " + std::to_string(row.height);
        ASSERT_EQ(made.textures.size(), 1U) << where;
        const Pixels picture = read(made.textures[0]);
        EXPECT_EQ(made.textures[0].width, row.wide) << where;
        EXPECT_EQ(made.textures[0].height, row.high) << where;
        EXPECT_EQ(picture.width, static_cast<int>(row.wide)) << where;
        EXPECT_EQ(picture.height, static_cast<int>(row.high)) << where;
        EXPECT_EQ(picture.channels, row.expected) << where;
        EXPECT_EQ(made.textures[0].mime, row.mime) << where;
        const std::array<int, 3> middle = picture.at(picture.width / 2, picture.height / 2);
        EXPECT_NEAR(middle[0], 104 + row.width / 8.0, 10) << where;
        if (row.isJpeg && row.mime == "image/jpeg") {
            EXPECT_EQ(made.textures[0].bytes, card.picture);
        }
    }
}

TEST_F(TexturesTest, WhatCannotBeCarriedOverIsANote) {
    std::string huge = written(quarters());
    huge.replace(16, 8, std::string("\0\0\x3A\x98\0\0\x3A\x98", 8)); // 15,000 pixels along both sides
    fs::create_directory(path("secret"));
    std::ofstream(path("secret/skin.png"), std::ios::binary) << written(quarters());
    const struct {
        std::string what, with, note;
    } rows[] = {
        {R"("bufferView":VIEW)", R"("uri":"../secret/skin.png")", "its picture \"../secret/skin.png\" is outside"},
        {R"("bufferView":VIEW)", R"("uri":"x/%2e%2e/../skin.png")", "is outside of its folder"},
        {R"("bufferView":VIEW)", R"("uri":"%2e%2e/skin.png")", "is outside of its folder"},
        {R"("bufferView":VIEW)", R"("uri":"/etc/passwd")", "is outside of its folder"},
        {R"("bufferView":VIEW)", R"("uri":"file:skin.png")", "is outside of its folder"},
        {R"("bufferView":VIEW)", R"("uri":"none.png")", "its picture \"none.png\""},
        {R"("bufferView":VIEW)", R"("uri":"data:image/png;base64,!")", "its picture has a URI"},
        {R"("bufferView":VIEW)", R"("bufferView":99)", "its picture refers to bufferViews[99]"},
        {R"({"source":0})", R"({"source":7})", "it refers to images[7]"},
        {R"({"source":0})", R"({"extensions":{}})", "it has no picture of a kind that pages hold"},
        {R"("index":0)", R"("index":3)", "it refers to textures[3]"},
        {R"("index":0)", R"("index":0,"texCoord":1)", "other texture coordinates"},
        {R"("index":0)", R"("index":0,"extensions":{"KHR_texture_transform":{}})", "moved texture coordinates"},
        {R"("materials":[)", R"("materials":7,"more":[)", "\"materials\" is not an array"},
    };
    for (const auto& row : rows) {
        Card card;
        for (std::string* text : {&card.image, &card.lists})
            if (const std::size_t at = text->find(row.what); at != std::string::npos)
                text->replace(at, row.what.size(), row.with);
        expectNote(card, row.note);
    }
    const std::string sound = written(clouds(16, 16, 3));
    for (const auto& [picture, note] : {std::pair{huge, "15000 x 15000 pixels"},
                                        {std::string("RIFFwebp"), "is no PNG or JPEG"},
                                        {sound.substr(0, sound.size() / 2), "images[0] is damaged"}}) {
        Card card;
        card.picture = picture;
        expectNote(card, note);
    }
    beforeGathering = [&] { std::ofstream(path("card.glb"), std::ios::binary) << "glTF"; };
    expectNote(Card(), "the textures of card.glb are not carried over: ");
    beforeGathering = [&] {
        Card other;
        other.materials = {0, 0};
        std::ofstream(path("card.glb"), std::ios::binary) << other.glb();
    };
    expectNote(Card(), "none of its meshes has the polygons of card");
}

} // namespace
} // namespace quarn
