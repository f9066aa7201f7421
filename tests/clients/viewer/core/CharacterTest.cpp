// SPDX-License-Identifier: Apache-2.0
// Natively: the points of the deformer, what is shown beside them, and what damaged blocks are answered with.
#include "viewer/Character.h"

#include "clients/viewer/core/SampleCharacter.h"
#include "nw_deform/Deformer.h"
#include "plugin/deformer/support/modelFolder.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

#include <cmath>
#include <cstring>
#include <limits>
#include <random>

namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using viewer::Character;
using viewer::Shape;

using Words = std::vector<std::uint32_t>;

std::vector<float> copyOf(std::span<const float> values) {
    return {values.begin(), values.end()};
}

bool areSameBits(std::span<const float> a, std::span<const float> b) {
    return a.size() == b.size() && std::memcmp(a.data(), b.data(), a.size_bytes()) == 0;
}

/// The model directory of a character whose outputs are multiples of its controls, and its deformer.
std::unique_ptr<neuralWarp::Deformer> deformerOf(const SampleCharacter& sample, const std::filesystem::path& folder) {
    const SampleOptions& options = sample.options();
    const std::size_t n = sample.mesh().vertexCount(), slots = options.isPartial ? n / 3 : n;
    const std::size_t outputs = options.shapes != 0 ? options.shapes : 3 * slots;
    ModelSpec spec;
    spec.controls = options.controls;
    spec.deltaMode = options.deltaMode;
    spec.smoothingIterations = options.passes;
    spec.weights = sample.get<float>("network.constants");
    spec.weights.resize(options.controls * outputs);
    spec.bias.assign(outputs, 0.0F);
    spec.shapes.resize(options.shapes);
    for (std::size_t i = 0; i < sample.basis().size(); ++i)
        spec.shapes[i / 3 % options.shapes].push_back(sample.basis()[i]);
    spec.fullCount = static_cast<std::uint32_t>(n);
    spec.affectCount = static_cast<std::uint32_t>(slots);
    if (options.isPartial) {
        spec.subsetState = "partial";
        spec.affectMap = sample.get<std::uint32_t>("model.vertices");
    }
    writeModel(folder, spec);
    return std::make_unique<neuralWarp::Deformer>(neuralWarp::Model::load(folder), sample.mesh().topology(),
                                                  sample.mesh().points);
}

TEST(ViewerCharacter, MovesPointsAsTheDeformerDoes) {
    const SampleOptions rows[] = {
        {.seed = 1},
        {.seed = 2, .basisBytes = 2, .isPartial = true},
        {.seed = 3, .basisBytes = 1, .deltaMode = 0, .hasWeights = true},
        {.seed = 4, .deltaMode = 0, .passes = 0, .isPartial = true, .hasEnvelope = true},
        {.seed = 5, .shapes = 0, .passes = 9, .hasWeights = true, .hasEnvelope = true},
        {.seed = 6, .shapes = 0, .deltaMode = 0, .isPartial = true, .takesPoints = true},
        {.seed = 7, .subdivisions = 4, .shapes = 17, .basisBytes = 2, .passes = 0, .takesPoints = true},
    };
    for (const SampleOptions& options : rows) {
        const TemporaryFolder folder;
        const SampleCharacter sample(options);
        const auto deformer = deformerOf(sample, folder.path() / "model");
        const auto envelopes =
            options.hasEnvelope ? sample.get<float>("frames.envelope") : std::vector<float>(options.frames, 1.0F);
        const auto weights = options.hasWeights ? sample.get<float>("weights") : std::vector<float>();
        Character character(sample.blocks());
        character.setEnvelope(0.75F);
        for (std::uint32_t frame = 0; frame < options.frames; ++frame) {
            character.showFrame(frame);
            const auto points = character.points(Shape::skin);
            std::vector<float> expected(points.size());
            deformer->evaluate({points.data(), character.controls(), envelopes[frame] * 0.75F,
                                weights.empty() ? nullptr : weights.data()},
                               expected.data());
            EXPECT_TRUE(areSameBits(character.points(Shape::neural), expected)) << options.seed << ' ' << frame;
            EXPECT_FALSE(areSameBits(points, expected)) << options.seed << ' ' << frame;
        }
    }
}

TEST(ViewerCharacter, ShowsTheTargetAndHowFarItIs) {
    SampleCharacter sample({.hasTargetPoints = true});
    auto numbers = sample.get<std::int16_t>("target.points");
    const std::size_t n = sample.mesh().vertexCount();
    for (std::size_t i = 0; i < 3; ++i) // vertex 0 of frame 1 at the box' three least, vertex 1 at its most
        numbers[3 * n + i] = -32768, numbers[3 * n + 3 + i] = 32767;
    sample.put("target.points", numbers);
    Character character(sample.blocks());
    EXPECT_TRUE(character.hasTarget() && character.hasErrors() && character.hasRig());
    EXPECT_THAT(character.points(Shape::neural), IsEmpty());
    character.showFrame(0);
    character.errors(Shape::neural); // asked for once, and again for another frame
    character.showFrame(1);
    const auto target = copyOf(character.points(Shape::target));
    EXPECT_THAT(std::span(target).first(6), testing::ElementsAre(-1.0F, -2.0F, -1.5F, 1.0F, 2.0F, 1.5F));
    for (const Shape shape : {Shape::skin, Shape::neural}) {
        const auto points = character.points(shape), errors = character.errors(shape);
        ASSERT_THAT(errors, SizeIs(n));
        for (std::size_t v = 0; v < n; ++v)
            EXPECT_NEAR(errors[v],
                        1000.0 * std::hypot(points[3 * v] - target[3 * v], points[3 * v + 1] - target[3 * v + 1],
                                            points[3 * v + 2] - target[3 * v + 2]),
                        1e-3);
    }
    EXPECT_THAT(character.errors(Shape::target), IsEmpty());
    character.showSliders(1, std::vector<double>(character.sliderCount(), 0.1));
    EXPECT_THAT(character.errors(Shape::skin), IsEmpty());
    EXPECT_TRUE(areSameBits(character.points(Shape::target), target));

    const SampleCharacter stored({.hasTargetPoints = false});
    Character other(stored.blocks());
    other.showFrame(2);
    EXPECT_THAT(other.points(Shape::target), IsEmpty());
    EXPECT_FLOAT_EQ(other.errors(Shape::neural)[7],
                    static_cast<float>(stored.get<std::uint8_t>("errors.after")[2 * n + 7]) * 5.0F / 255.0F);
    EXPECT_FLOAT_EQ(other.errors(Shape::skin)[7],
                    static_cast<float>(stored.get<std::uint8_t>("errors.before")[2 * n + 7]) * 5.0F / 255.0F);
}

TEST(ViewerCharacter, DrawsASphereWithSeams) {
    SampleCharacter sample({.subdivisions = 4, .passes = 0, .takesPoints = true, .hasSeams = true});
    std::vector<float> sphere;
    for (std::uint32_t frame = 0; frame < 4; ++frame)
        for (const auto& p : sample.mesh().points) // small, as a model in metres
            sphere.insert(sphere.end(), {p.x * 1e-3F, p.y * 1e-3F, p.z * 1e-3F});
    sample.put("frames.points", sphere);
    Character character(sample.blocks());
    character.showFrame(3);
    const auto drawn = sample.get<std::uint32_t>("draw.vertices");
    const auto points = character.drawPoints(Shape::skin), normals = character.drawNormals(Shape::skin);
    const auto errors = character.drawErrors(Shape::skin);
    ASSERT_EQ(character.drawVertexCount(), drawn.size());
    ASSERT_THAT(points, SizeIs(3 * drawn.size()));
    for (std::size_t i = 0; i < drawn.size(); ++i) {
        EXPECT_EQ(errors[i], character.errors(Shape::skin)[drawn[i]]);
        for (std::size_t axis = 0; axis < 3; ++axis) {
            EXPECT_EQ(points[3 * i + axis], sphere[std::size_t{3} * drawn[i] + axis]);
            EXPECT_NEAR(normals[3 * i + axis], 1e3F * points[3 * i + axis], 0.02F); // outwards
        }
    }
    const auto corners = sample.get<std::uint32_t>("draw.corners");
    EXPECT_THAT(character.triangles(), testing::ElementsAreArray(corners)); // all of them triangles
    sample.put("mesh.sizes", Words{5});
    sample.put("mesh.corners", Words{0, 1, 2, 3, 4});
    sample.put("draw.corners", Words{0, 1, 2, 3, 4});
    EXPECT_THAT(Character(sample.blocks()).triangles(), testing::ElementsAre(0, 1, 2, 0, 2, 3, 0, 3, 4));
}

TEST(ViewerCharacter, FindsAFlippedBit) {
    SampleCharacter sample({.basisBytes = 2});
    sample.addChecks({3, 0});
    const viewer::Blocks good = sample.blocks();
    sample.bytes()["basis.values"][1] ^= std::byte{1};
    const viewer::Blocks bad = sample.blocks();
    EXPECT_NE(good.sum("basis.values"), bad.sum("basis.values"));
    Character character(good), damaged(bad);
    character.setEnvelope(0.5F); // which a check does not count
    EXPECT_TRUE(character.check(0) && character.check(1));
    EXPECT_FALSE(damaged.check(0));
    EXPECT_THAT(failureOf([&] { character.check(2); }), HasSubstr("check 2 is none of 2"));
}

/// Why a character does not open; empty where it does, and shows a frame and its sliders.
std::string problemOf(SampleCharacter& sample) {
    return failureOf([&] {
        Character character(sample.blocks());
        character.showFrame(0);
        if (character.hasRig())
            character.showSliders(0, std::vector<double>(character.sliderCount(), 0.5));
        character.drawNormals(Shape::neural);
        character.drawErrors(Shape::skin);
    });
}

TEST(ViewerCharacter, RefusesDamagedBlocksByName) {
    struct Row {
        const char* block;
        std::size_t place;
        std::uint32_t value;
        const char* said;
    };
    const Row rows[] = {
        {"settings", 0, 2, "the page is of version 2"},
        {"settings", 1, 163, "\"mesh.rest\": it has 486 numbers, and 489 are needed"},
        {"settings", 1, 0xFFFFFFFF, "the number of vertices is 4294967295"},
        {"settings", 2, 2, "the delta mode is 2"},
        {"settings", 3, 4000000000, "the number of smoothing iterations is 4000000000"},
        {"settings", 4, 0xFFFFFFFF, "the network gives 7 values, and 4294967295 are needed"},
        {"settings", 6, 8, "\"frames.controls\": it has 36 numbers, and 32 are needed"},
        {"settings", 7, 0, "there are no frames"},
        {"settings", 9, 4, "\"frames.matrices\": it has 288 numbers, and 192 are needed"},
        {"mesh.sizes", 0, 0xFFFFFFFF, "\"mesh.sizes\": its counts add up to 4294968252"},
        {"mesh.corners", 5, 162, "\"mesh.corners\": number 5 is 162, and there are 162 vertices"},
        {"model.vertices", 2, 162, "\"model.vertices\": number 2 is 162"},
        {"draw.vertices", 1, 900, "\"draw.vertices\": number 1 is 900"},
        {"draw.corners", 0, 161, "\"draw.corners\": corner 0 is drawn at vertex 161, and is one of vertex"},
        {"skin.influences", 0, 6, "\"skin.influences\": number 0 is 6, and there are 6 matrices"},
        {"shapes.vertices", 1, 0, "\"shapes.vertices\": vertex 0 comes after"},
        {"rig.parents", 2, 2, "the parent of joint 2 is 2"},
        {"rig.parents", 0, 0xFFFFFFFE, "the parent of joint 0 is -2"},
        {"rig.orders", 4, 6, "\"rig.orders\": number 4 is 6"},
        {"rig.sliders", 1, 12, "\"rig.sliders\": channel 12 is none of 12"},
        {"rig.animated", 0, 5, "\"rig.animated\": joint 5 is none of 5"},
        {"rig.animated", 3, 3, "\"rig.animated\": free value 3 is none of 3"},
        {"rig.controls", 0, 5, "\"rig.controls\": kind 5 is none of 5"},
        {"rig.controls", 1, 1, "\"rig.controls\": constant 1 is none of 1"},
        {"rig.controls", 12, 4, "\"rig.controls\": converted value 4 is none of 4"},
        {"rig.controls", 9, 4, "\"rig.controls\": converter 4 is none of 4"},
        {"rig.controls", 27, 6, "\"rig.controls\": axis value 6 is none of 6"},
        {"rig.controls", 28, 3, "\"rig.controls\": matrix 3 is none of 3"},
        {"rig.converters", 1, 4, "\"rig.converters\": rotation conversion 4 is none of 4"},
        {"rig.weights", 0, 3, "\"rig.weights\": free value 3 is none of 3"},
        {"rig.factors", 0, 1, "\"rig.factors\": blend shape 1: factors[0] is 1, but there is no weight[1]"},
        {"skin.joints", 0, 5, "\"skin.joints\": joint 5 is none of 5"},
        {"frames.controls", 3, 0x7F800000, "\"frames.controls\": number 3 is not finite"},
        {"rig.channels", 5, 0x7FF00000, "\"rig.channels\": number 2 is not finite"},
        {"check.frames", 0, 4, "\"check.frames\": number 0 is 4, and there are 4 frames"},
    };
    SampleCharacter good({.isPartial = true, .hasSeams = true});
    good.addChecks({2});
    ASSERT_EQ(problemOf(good), "");
    for (const Row& row : rows) {
        SampleCharacter bad = good;
        auto words = bad.get<std::uint32_t>(row.block);
        words.at(row.place) = row.value;
        bad.put(row.block, words);
        EXPECT_THAT(problemOf(bad), HasSubstr(row.said)) << row.block;
    }
    for (const auto& [name, bytes] : good.bytes()) {
        SampleCharacter bad = good;
        bad.bytes()[name].pop_back();
        const bool mayBeAway = name == "basis.scales" || name == "rig.limits" || name == "frames.sliders";
        EXPECT_THAT(problemOf(bad), HasSubstr(mayBeAway ? "" : '"' + name + '"')) << name;
    }
    SampleCharacter singular = good;
    auto controls = singular.get<std::uint32_t>("rig.controls");
    controls[28] = 0; // of the relative matrix
    singular.put("rig.controls", controls);
    singular.put("rig.rest", std::vector<double>(80, 0.0));
    EXPECT_THAT(problemOf(singular), testing::ContainsRegex("rig.rest.*joint . is singular"));
}

/// Words and counts spoilt at random are refused, or harmless: sanitizers see to that.
TEST(ViewerCharacter, SurvivesWordsOfAnyKind) {
    const SampleCharacter good({.subdivisions = 1, .isPartial = true, .hasSeams = true});
    std::mt19937 random(5);
    std::size_t refused = 0;
    for (int i = 0; i < 2000; ++i) {
        SampleCharacter bad = good;
        auto at = bad.bytes().begin();
        std::advance(at, random() % bad.bytes().size());
        if (at->second.size() < 4 || at->first == "settings")
            continue;
        const auto word = static_cast<std::uint32_t>(random() % 3 == 0 ? 0xFFFFFFFF : random() % 40);
        std::memcpy(at->second.data() + random() % (at->second.size() / 4) * 4, &word, sizeof(word));
        refused += problemOf(bad).empty() ? 0U : 1U;
    }
    EXPECT_GT(refused, 200U);
}

TEST(ViewerCharacter, RefusesWhatItIsAskedWrongly) {
    const SampleCharacter sample({});
    Character character(sample.blocks());
    std::vector<double> values(character.sliderCount(), 0.0);
    EXPECT_EQ(failureOf([&] { character.showFrame(4); }), "frame 4 is none of 4");
    EXPECT_EQ(failureOf([&] { character.showSliders(9, values); }), "frame 9 is none of 4");
    EXPECT_EQ(failureOf([&] { character.showSliders(0, std::span(values).first(2)); }), "2 values for 6 sliders");
    values[4] = std::numeric_limits<double>::infinity();
    EXPECT_EQ(failureOf([&] { character.showSliders(0, values); }), "the value of slider 4 is not finite");
    EXPECT_THAT(character.points(static_cast<Shape>(7)), IsEmpty());
    viewer::Blocks blocks;
    blocks.add("settings", std::vector<std::byte>(4));
    EXPECT_EQ(failureOf([&] { blocks.add("settings", std::vector<std::byte>(4)); }),
              "the block \"settings\" is there twice");
    EXPECT_EQ(failureOf([&] { Character(blocks).frameCount(); }),
              "the block \"settings\": it has 1 numbers, and 16 are needed");
}

} // namespace
