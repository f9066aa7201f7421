// SPDX-License-Identifier: Apache-2.0
// What a deformer refuses, and that nobody notices another. Its bits are compared with the plug-in's where that is
// tested.
#include "DeformTest.h"

#include "nw_deform/deformCharacters.h"

#include <functional>
#include <limits>

namespace {

using neuralWarp::Deformer;
using neuralWarp::Pose;
using testing::HasSubstr;

constexpr float nan = std::numeric_limits<float>::quiet_NaN();

class DeformerMisuse : public DeformTest {
protected:
    std::unique_ptr<Deformer> deformer(const neuralWarp::Points& rest) const {
        return std::make_unique<Deformer>(neuralWarp::Model::load(directory), grid.topology(), rest);
    }
    std::unique_ptr<Deformer> deformer() const { return deformer(grid.points); }

    const ZooMesh grid = makeGrid(2, 2);
};

/// What a frame is asked for.
struct Arguments {
    std::vector<float> points = std::vector<float>(27, 1.0F);
    std::vector<float> controls{0.5F};
    std::vector<float> weights = std::vector<float>(9, 1.0F);
    float envelope = 1.0F;
    std::vector<float> out = std::vector<float>(27, 7.0F);

    Pose pose() const { return {points.data(), controls, envelope, weights.data()}; }
};

TEST_F(DeformerMisuse, IsNamedByArgumentAndPlace) {
    struct Row {
        std::function<void(Arguments&)> spoil;
        const char* said;
    };
    const auto own = deformer();
    for (const Row& row :
         {Row{[](Arguments& a) { a.controls.clear(); }, "controls has 0 values, and the model takes 1"},
          Row{[](Arguments& a) {
                  a.controls = {1, 2};
              },
              "controls has 2 values"},
          Row{[](Arguments& a) { a.controls[0] = nan; }, "controls: control 0 is nan"},
          Row{[](Arguments& a) { a.points[26] = nan; }, "points: vertex 8 has the value nan"},
          Row{[](Arguments& a) { a.points[3] = a.points[26] = -1.0F / 0.0F; }, "points: vertex 1 has the value -inf"},
          Row{[](Arguments& a) { a.weights[8] = nan; }, "weights: vertex 8 has the value nan"},
          Row{[](Arguments& a) { a.envelope = nan; }, "envelope is nan"}}) {
        Arguments arguments;
        row.spoil(arguments);
        EXPECT_THAT(failureOf([&] { own->evaluate(arguments.pose(), arguments.out.data()); }), HasSubstr(row.said));
        EXPECT_EQ(arguments.out, std::vector<float>(27, 7.0F));
    }
    Arguments good;
    own->evaluate(good.pose(), good.out.data()); // it is free again
    EXPECT_EQ(good.out[26], 1.5F);

    neuralWarp::Points rest = grid.points;
    rest[4].y = nan;
    EXPECT_THAT(failureOf([&] { deformer(rest); }), HasSubstr("rest: vertex 4 has the value nan"));
    rest.pop_back();
    EXPECT_THAT(failureOf([&] { deformer(rest); }), HasSubstr("rest has 8 vertices, and the model was trained on a "
                                                              "mesh of 9"));
}

TEST_F(DeformerMisuse, ASecondUserIsRefusedAndTheFirstOneServed) {
    write(0.0F, 1000);
    const auto own = deformer();
    Arguments arguments, beside;
    int refused = 0;
    const auto useAgain = [&] {
        try {
            own->evaluate(beside.pose(), beside.out.data());
        } catch (const neuralWarp::DeformerInUse&) {
            ++refused;
        }
        return false;
    };
    own->evaluate(arguments.pose(), arguments.out.data(), useAgain);
    EXPECT_GT(refused, 0);
    EXPECT_EQ(beside.out[26], 7.0F);
    EXPECT_EQ(arguments.out[26], 1.5F);
    EXPECT_THROW(own->evaluate(arguments.pose(), arguments.out.data(), [] { return true; }), quill::Cancelled);
    own->evaluate(beside.pose(), beside.out.data());
    EXPECT_EQ(beside.out, arguments.out);
}

TEST_F(DeformerMisuse, OneOfManyCharactersLeavesTheOthersAlone) {
    const auto model = neuralWarp::Model::load(directory);
    std::vector<std::unique_ptr<Deformer>> deformers;
    std::vector<Arguments> arguments(5);
    std::vector<neuralWarp::CharacterFrame> frames;
    for (Arguments& each : arguments) {
        each.controls[0] = static_cast<float>(deformers.size());
        deformers.push_back(std::make_unique<Deformer>(model, grid.topology(), grid.points));
    }
    arguments[1].controls[0] = arguments[3].points[0] = nan;
    for (std::size_t i = 0; i < 5; ++i)
        frames.push_back({deformers[i].get(), arguments[i].pose(), arguments[i].out.data()});
    EXPECT_EQ(failureOf([&] { deformCharacters(frames); }), "character 1: controls: control 0 is nan");
    for (const std::size_t i : {0U, 2U, 4U})
        EXPECT_EQ(arguments[i].out[26], 1.0F + static_cast<float>(i));
    frames[4].deformer = deformers[2].get();
    arguments[0].out[26] = 7.0F;
    EXPECT_EQ(failureOf([&] { deformCharacters(frames); }), "deformers: character 4 has the deformer of character 2");
    EXPECT_EQ(arguments[0].out[26], 7.0F);
}

} // namespace
