// SPDX-License-Identifier: Apache-2.0
// Kinds of deltas, compared before anything is trained: what is measured, what is chosen, and what is warned of.
#include "quarn/dataset/ExportScene.h"

#include "quarn/dataset/ControlFit.h"
#include "quarn/dataset/DeltaCarriers.h"
#include "quarn/dataset/FrameSampler.h"
#include "quarn/dataset/exportFrames.h"
#include "quarn/dataset/smoothingChoice.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"

#include <cmath>
#include <limits>

namespace {

using quarn::DeltaKind;
using quarn::SmoothingStudy;
using ::testing::HasSubstr;
using ::testing::Not;

constexpr double none = std::numeric_limits<double>::quiet_NaN();

/// Of comparedKinds(), in their order: mean error, jitter, turn.
SmoothingStudy studyWith(const std::vector<std::array<double, 3>>& figures) {
    SmoothingStudy study;
    const std::vector<DeltaKind> kinds = quarn::comparedKinds();
    for (std::size_t i = 0; i < figures.size(); ++i)
        study.kinds.push_back({kinds[i], figures[i][0], figures[i][0], figures[i][1], figures[i][2]});
    return study;
}

TEST(SmoothingChoice, TakesTheLeastErrorOfWhatIsCalm) {
    struct Row {
        const char* what;
        std::vector<std::array<double, 3>> figures; // Offset, Surface with 0, 2, 5, 10 passes
        std::size_t chosen;
    };
    for (const Row& row : std::vector<Row>{
             {"least error", {{5, 1, 0}, {4, 1, 9}, {3, 1, 9}, {1, 1, 9}, {2, 1, 9}}, 3},
             {"its jitter is at most 1.5 times the least", {{5, 1, 0}, {1, 1.6, 9}, {3, 1.4, 9}, {4, 1, 9}}, 2},
             {"Offset may have the least", {{5, 1, 0}, {1, 1.6, 9}, {1, 2, 9}, {1, 9, 9}}, 0},
             {"a flip is worse than an error", {{5, 1, 0}, {1, 1, 120}, {3, 1, 20}}, 2},
             {"no flip where the pose itself turns as far", {{5, 1, 0}, {1, 1, 120}, {3, 1, 100}}, 1},
             {"of nearly equal ones the fewest passes", {{5, 1, 0}, {1.04, 1, 9}, {1.02, 1, 9}, {1, 1, 9}}, 1},
             {"but not of those with more error", {{5, 1, 0}, {1.06, 1, 9}, {1.04, 1, 9}, {1, 1, 9}}, 2},
             {"Offset before Surface", {{1, 1, 0}, {1, 1, 9}}, 0},
             {"what is no number is not chosen", {{none, none, 0}, {1, none, 9}, {2, 1, 9}}, 2},
         })
        EXPECT_EQ(quarn::chosenKind(studyWith(row.figures)), row.chosen) << row.what;
}

TEST(SmoothingChoice, WarnsOfJumpsThatAreSeen) {
    const auto warning = [](double jitter, double ofOffset) {
        SmoothingStudy study;
        study.kinds = {{{1, 5}, 1, 1, jitter, 170}, {{0, 0}, 1, 1, ofOffset, 0}};
        return quarn::jumpWarning(study, "arm", 100.0, 0.01);
    };
    EXPECT_THAT(warning(0.5, 0.2), HasSubstr("Surface deltas with 5 smoothing passes move arm in jumps: between poses "
                                             "the correction has a jitter of 5 mm, where that of Offset deltas has 2"));
    EXPECT_EQ(warning(0.5, 0.3), "");    // the pose moves so
    EXPECT_EQ(warning(0.04, 0.001), ""); // too small for a mesh of 100
    EXPECT_EQ(warning(none, 0.3), "");
}

TEST(ControlFit, PredictsPlanesAndCurvesAndSurvivesStillControls) {
    std::vector<std::vector<float>> rows;
    std::vector<double> plane, curve;
    const auto valuesAt = [](float a, float b) {
        return std::pair(3.0 + 20.0 * a - 0.01 * b, std::sin(4.0 * a) + 0.0001 * b * b);
    };
    for (int i = 0; i < 64; ++i) {
        const int row = i / 8;
        const float a = static_cast<float>(i % 8) / 7.0F, b = 100.0F * static_cast<float>(row) / 7.0F;
        rows.push_back({a, 7.0F, b}); // the second never moves
        plane.push_back(valuesAt(a, b).first);
        curve.push_back(valuesAt(a, b).second);
    }
    const quarn::ControlFit fit(rows);
    for (const auto& [a, b] : {std::pair(0.31F, 42.0F), {0.7F, 90.0F}, {0.05F, 11.0F}}) {
        const std::vector<float> weights = fit.weights(std::vector<float>{a, 7.0F, b});
        double linear = 0.0, curved = 0.0;
        for (std::size_t row = 0; row < rows.size(); ++row) {
            linear += static_cast<double>(weights[row]) * plane[row];
            curved += static_cast<double>(weights[row]) * curve[row];
        }
        EXPECT_NEAR(linear, valuesAt(a, b).first, 0.02) << a << ' ' << b;
        EXPECT_NEAR(curved, valuesAt(a, b).second, 0.01) << a << ' ' << b;
    }
}

class SmoothingTest : public ExportScene {
protected:
    static constexpr std::size_t frames = 48;

    /// A target that goes with the joint, and is a bump away from the skin: Surface deltas of it are always the same.
    void writeBump() {
        std::vector<std::vector<float>> cache;
        for (std::size_t frame = 0; frame <= frames; ++frame) {
            std::vector<float> xyz = restPoints();
            for (std::size_t i = 0; i < xyz.size(); ++i)
                xyz[i] += 0.1F * std::sin(static_cast<float>(7 * i));
            cache.push_back(turned(xyz, frame));
        }
        writeCache(cache);
    }
    /// What comes into the deformer folds over in the middle of the frames, and its target lies a little above it.
    void writeFold() {
        std::vector<std::vector<float>> skin, target;
        for (std::size_t frame = 0; frame <= frames; ++frame) {
            std::vector<float> xyz = restPoints();
            const float t = static_cast<float>(frame) / frames;
            for (const std::size_t vertex : {std::size_t{0}, std::size_t{6}}) // the first column, over the second
                xyz[3 * vertex] += 2.5F * t;
            skin.push_back(xyz);
            for (std::size_t i = 2; i < xyz.size(); i += 3)
                xyz[i] += 0.15F + 0.05F * std::sin(4.0F * t);
            target.push_back(xyz);
        }
        writeCache(target);
        writeRawCache(folder.path() / "fold.npy", skin);
    }
    static constexpr const char* foldScript = R"(
createNode pointCache -name fold
connectAttr strip.outMesh fold.inMesh
connectAttr time1.outTime fold.time
setAttr fold.cacheFile fold.npy
connectAttr -force fold.outMesh warp.input[0].inputGeometry
)";

    SmoothingStudy studied(const std::vector<DeltaKind>& kinds) const {
        quarn::SceneSession session(options().scene);
        const quarn::Warp warp = quarn::Warp::find();
        quill::IndexMapper map;
        map.setIdentity(vertexCount);
        const int before = quarn::wholeNumberOf(quarn::findPlug("swing.interpolation"));
        SmoothingStudy study = quarn::studySmoothing(session.host(), warp, warp.geometry(""), map,
                                                     quarn::exportFrames(warp, ""), kinds, options().console);
        EXPECT_EQ(quarn::wholeNumberOf(quarn::findPlug("swing.interpolation")), before);
        return study;
    }
    std::map<std::string, std::string> exported(const quarn::ExportOptions& flags) {
        ::testing::internal::CaptureStderr();
        answer = quarn::exportDatasets(flags).at(0);
        said = ::testing::internal::GetCapturedStderr();
        return contentsOf(answer.folder);
    }
    quarn::ExportOptions to(const std::string& name) const {
        quarn::ExportOptions flags = options();
        flags.output = folder.path() / name;
        return flags;
    }

    quarn::ExportAnswer answer;
    std::string said; ///< on standard error
};

// what is measured here is what the deformer does: its deltas, and where they lead
TEST_F(SmoothingTest, CarriesDeltasAsTheDeformerDoes) {
    writeTarget(frames);
    const std::vector<std::uint32_t> vertices = {1, 4, 11};
    for (const DeltaKind& kind : std::vector<DeltaKind>{{0, 0}, {0, 3}, {1, 0}, {1, 3}}) {
        SCOPED_TRACE(kind.text());
        save(frames, "setAttr warp.export[0].deltaMode " + std::string(kind.label()) +
                         "; setAttr warp.export[0].smoothingIterations " + std::to_string(kind.smoothingIterations));
        quarn::SceneSession session(options().scene);
        const quarn::Warp warp = quarn::Warp::find();
        const quarn::WarpGeometry& geometry = warp.geometry("");
        quarn::FrameSampler sampler(session.host(), warp, geometry, 1);
        sampler.sample(9);
        std::vector<float> xyz;
        quarn::readPoints(geometry.original, xyz);
        quill::IndexMapper map;
        map.setIdentity(vertexCount);
        // among others, in another order: what one has smoothed, the next goes on from
        quarn::DeltaCarriers carriers(quarn::polygonsOf(geometry.original), xyz, map, vertices,
                                      {{1, 7}, kind, {0, 1}, {1, 2}});
        quarn::readPoints(geometry.input, xyz);
        carriers.measure(xyz);
        std::vector<quill::val3<float>> target;
        quarn::readPoints(geometry.target, xyz);
        carriers.pick(xyz, target);
        for (std::size_t k = 0; k < vertices.size(); ++k) {
            const quill::val3<float> delta = carriers.of(1)[k].deltaTo(target[k]);
            const quill::val3<float> placed = carriers.of(1)[k].place(delta);
            for (std::size_t axis = 0; axis < 3; ++axis) {
                EXPECT_NEAR(delta[axis], sampler.deltas()[std::size_t{3} * vertices[k] + axis], 1e-5F);
                EXPECT_NEAR(placed[axis], target[k][axis], 1e-5F);
            }
        }
    }
}

TEST_F(SmoothingTest, ChoosesSurfaceForWhatTurnsWithTheSkinAndOffsetForWhatFolds) {
    writeBump();
    // with the axes as controls a plane would be enough for both
    save(frames, "disconnectAttr axes.outputList[0].output controls.inputList[0].input");
    quarn::ExportOptions flags = to("bump");
    flags.smoothing = "auto";
    exported(flags);
    ASSERT_TRUE(answer.choice);
    EXPECT_TRUE(answer.choice->study.kinds[answer.choice->chosen].kind.isSurface());
    EXPECT_LT(answer.choice->study.kinds[1].mean, 0.5 * answer.choice->study.kinds[0].mean);

    writeFold();
    save(frames, foldScript);
    flags = to("fold");
    exported(flags);
    EXPECT_THAT(said, HasSubstr("warning: Surface deltas with 0 smoothing passes move strip in jumps"));
    EXPECT_FALSE(answer.choice);
    flags = to("chosen");
    flags.smoothing = "auto";
    const auto chosen = exported(flags);
    EXPECT_THAT(said, Not(HasSubstr("in jumps")));
    ASSERT_TRUE(answer.choice);
    EXPECT_EQ(answer.choice->chosen, 0U);
    EXPECT_THAT(quarn::choiceText(*answer.choice, "strip", 1.0), HasSubstr("\n* Offset        0 "));

    // the study leaves the scene as it was; a data set like it is the same
    flags = to("like");
    flags.like = folder.path() / "chosen";
    EXPECT_EQ(exported(flags), chosen);
    save(frames, foldScript + std::string("setAttr warp.export[0].deltaMode Offset"));
    EXPECT_EQ(exported(to("set"))["deltas.npy"], chosen.at("deltas.npy"));
    flags.like = folder.path() / "nowhere";
    EXPECT_THAT(errorOf(flags), HasSubstr("nowhere/dataset.json"));
}

// poses that hold are no motion: what is between two of them is walked through, and the curves are in steps again
TEST_F(SmoothingTest, WalksBetweenPosesThatHold) {
    std::string times, values;
    for (std::size_t frame = 0; frame < frames; ++frame) {
        times += " " + std::to_string(frame + 1);
        values += frame % 2 == 0 ? " 0" : " 1";
    }
    std::vector<std::vector<float>> cache(frames, restPoints());
    writeCache(cache);
    save(frames, "setAttr swing.keyTimes" + times + "; setAttr swing.keyValues" + values +
                     "; setAttr swing.interpolation step");
    const SmoothingStudy study = studied({{0, 0}, {1, 0}});
    EXPECT_EQ(study.steps, 8U * 25U);
    // one radian in 24 steps
    EXPECT_NEAR(study.kinds[1].turn, 57.3 / 24, 0.1);
}

TEST_F(SmoothingTest, FewFramesKeepTheKindOfTheScene) {
    writeTarget(11);
    save(11);
    quarn::ExportOptions flags = to("few");
    flags.smoothing = "auto";
    flags.console.quiet = false;
    const auto files = exported(flags);
    EXPECT_THAT(said, HasSubstr("compared on 12 frames or more, and there are 11"));
    EXPECT_FALSE(answer.choice);
    EXPECT_THAT(files.at("dataset.json"), HasSubstr("\"deltaType\": \"dos\""));
}

} // namespace
