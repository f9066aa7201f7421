// SPDX-License-Identifier: Apache-2.0
// quarn target: caches with a mistake in them, of the posed strip.
#include "PoseTest.h"

#include "quarn/pose/skinCache.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/shownMeshes.h"
#include "storage/NpyFile.h"
#include "support/rawCache.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <sstream>

namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using Frame = std::vector<float>;
using Frames = std::vector<Frame>;

constexpr std::size_t vertices = stripScene::vertexCount;
constexpr std::size_t poses = 30;

class TargetAimTest : public PoseTest {
protected:
    TargetAimTest() { right_ = posed("posed.json", "1"); }

    /// The strip in so many poses, and the targets that belong to them: where it bends, a vertex is up to 3 % of the
    /// strip beside its skin.
    Frames posed(const std::string& name, const std::string& seed) const {
        stripScene::write(scene(), "setAttr poses.limitsList[1].limits[0].defaultValue 0;" // the rest pose
                                   "setAttr poses.limitsList[1].limits[0].minValue 0");
        stripScene::quarn({"pose", scene(), "-o", path(name), "--samples", std::to_string(poses), "--seed", seed});
        const auto session = open(name);
        Frames frames(poses);
        for (std::size_t frame = 0; frame < poses; ++frame) {
            session->host().setTime(static_cast<double>(frame + 1));
            quarn::readPoints(quarn::findPlug("strip_skin.outputGeom[0]"), frames[frame]);
            for (std::size_t i = 0; i < frames[frame].size() && frame > 0; ++i)
                frames[frame][i] += 0.03F * std::sin(static_cast<float>(7 * i));
        }
        return frames;
    }
    std::string cache(const Frames& frames) const {
        writeRawCache(path("cache.npy"), frames);
        return path("cache.npy");
    }
    std::string target(const std::string& flags) const {
        return connected("--cache " + path("cache.npy") + " " + flags);
    }
    std::string connected(const std::string& flags) const {
        std::vector<std::string> arguments{"target", path("posed.json"), "-o", path("aimed.json"), "--json"};
        std::istringstream words(flags);
        for (std::string word; words >> word;)
            arguments.push_back(word);
        return stripScene::quarn(arguments);
    }
    /// Whether the target that the scene has is the right one, but for what a shift leaves without a frame.
    bool isRight() const {
        const auto session = open("aimed.json");
        for (std::size_t frame = 1; frame + 1 < poses; ++frame) {
            session->host().setTime(static_cast<double>(frame + 1));
            Frame found;
            quarn::readPoints(quarn::findPlug("strip_target.outMesh"), found);
            for (std::size_t i = 0; i < found.size(); ++i)
                if (std::abs(found[i] - right_[frame][i]) > 1e-4F)
                    return false;
        }
        return true;
    }

    Frames right_;
};

Frames moved(const Frames& frames, const std::function<Frame(float, float, float)>& move) {
    Frames result = frames;
    for (Frame& frame : result)
        for (std::size_t i = 0; i < frame.size(); i += 3) {
            const Frame point = move(frame[i], frame[i + 1], frame[i + 2]);
            std::copy(point.begin(), point.end(), frame.begin() + static_cast<std::ptrdiff_t>(i));
        }
    return result;
}

Frames mixed(const Frames& frames) {
    Frames result = frames;
    for (std::size_t frame = 0; frame < frames.size(); ++frame)
        for (std::size_t i = 0; i < frames[frame].size(); ++i)
            result[frame][i] = frames[frame][3 * (i / 3 * 5 % vertices) + i % 3];
    return result;
}

// each is named with the flags that mend it; the flags do, and so does --align
TEST_F(TargetAimTest, MistakesAreNamedAndMended) {
    Frames late = right_;
    late.insert(late.begin(), late.front());
    late.pop_back();
    const struct {
        Frames frames;
        const char *says, *flags;
    } rows[] = {
        {late, "one frame late", "--start-frame 0"},
        {moved(right_,
               [](float x, float y, float z) {
                   return Frame{100 * x, 100 * y, 100 * z};
               }),
         "centimetres against metres", "--scale 0.01"},
        {moved(right_,
               [](float x, float y, float z) {
                   return Frame{x, -z, y};
               }),
         "its z were up", "--axes z"},
        {mixed(right_), "its vertices were in another order", "--order rest"},
        {moved(right_,
               [](float x, float y, float z) {
                   return Frame{x, -y, z};
               }),
         "mirrored in y", ""},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.says);
        cache(row.frames);
        std::filesystem::remove(path("aimed.json"));
        std::filesystem::remove(path("aimed.strip_target.npy"));
        const std::string flags = row.flags;
        const std::string refusal = failureOf([&] { target(""); });
        EXPECT_THAT(refusal, AllOf(HasSubstr("cache.npy is "), HasSubstr(row.says), HasSubstr("--align"),
                                   HasSubstr(flags.empty() ? "--anyway" : "With " + flags + " it would be")));
        EXPECT_FALSE(std::filesystem::exists(path("aimed.json")));
        EXPECT_FALSE(std::filesystem::exists(path("aimed.strip_target.npy")));
        EXPECT_THAT(target("--anyway"), AllOf(HasSubstr(row.says), HasSubstr("\"mendingFlags\": \"" + flags + "\"")));
        EXPECT_FALSE(isRight());
        EXPECT_THAT(target("--align"), HasSubstr("\"aligned\": true"));
        EXPECT_TRUE(isRight());
        if (!flags.empty()) {
            EXPECT_THAT(target(flags), HasSubstr("\"looksAsIf\": \"\""));
        }
        EXPECT_TRUE(isRight());
    }
}

TEST_F(TargetAimTest, OtherPosesAreToldAndRightOnesAreNot) {
    cache(right_);
    EXPECT_THAT(target("--align"), AllOf(HasSubstr("\"looksAsIf\": \"\""), HasSubstr("\"aligned\": false"),
                                         HasSubstr("\"converted\": false"), HasSubstr("\"meanMm\": ")));
    EXPECT_TRUE(isRight());
    cache(posed("other.json", "2"));
    const std::string before = bytes(path("aimed.json"));
    EXPECT_THAT(failureOf([&] { target("--align"); }), HasSubstr("these frames do not belong to these poses"));
    EXPECT_EQ(bytes(path("aimed.json")), before);
    target("--anyway");
    EXPECT_FALSE(isRight());
}

// a skin that cannot be had is no reason against a target
TEST_F(TargetAimTest, WhatCannotBeComparedIsTaken) {
    cache(right_);
    stripScene::write(path("posed.json"),
                      "createNode mesh -name none; connectAttr -force none.outMesh warp.input[0].inputGeometry");
    EXPECT_THAT(target("--align"), HasSubstr("\"fit\": null"));
    EXPECT_THAT(bytes(path("aimed.json")), HasSubstr("_target"));
}

// a skin of another kind may be far from quarn's own, but is that of this character in these poses; targets are
// compared with it from then on
TEST_F(TargetAimTest, SkinsTakeThePlaceOfTheScenesOwn) {
    Frames swollen = right_; // but for its first frame, at rest
    for (std::size_t frame = 1; frame < poses; ++frame)
        for (std::size_t i = 0; i < swollen[frame].size(); ++i)
            swollen[frame][i] += 1.5F * std::sin(static_cast<float>(7 * i));
    const auto place = [&](const Frames& frames, const std::string& name) {
        writeRawCache(path(name), frames);
        return "--skin " + path(name);
    };
    cache(right_);
    const std::string far = place(swollen, "far.npy");
    ::testing::internal::CaptureStderr();
    const std::string first = connected(far);
    EXPECT_THAT(::testing::internal::GetCapturedStderr(), HasSubstr("mm from quarn's own skin in the mean"));
    EXPECT_THAT(first, AllOf(HasSubstr("\"node\": \"strip_skinCache\""), HasSubstr("\"replaced\": false")));
    EXPECT_THAT(first, ::testing::Not(HasSubstr("\"target\"")));

    std::filesystem::copy_file(path("aimed.json"), path("posed.json"),
                               std::filesystem::copy_options::overwrite_existing);
    const std::string both = connected(place(right_, "near.npy") + " --cache " + path("cache.npy"));
    EXPECT_THAT(both, AllOf(HasSubstr("\"replaced\": true"), HasSubstr("\"meanMm\": 0.0,")));
    {
        const auto session = open("aimed.json");
        const quarn::Warp warp = quarn::Warp::find();
        const quarn::WarpGeometry& strip = warp.geometry("strip");
        EXPECT_EQ(quarn::nodesOfType("pointCache").size(), 2U);
        EXPECT_EQ(quarn::textOf(quarn::findPlug("strip_skinCache.cacheFile")), "near.npy");
        EXPECT_EQ(strip.original.source(), quarn::findPlug("strip.outMesh"));
        EXPECT_EQ(quarn::ownSkin(strip), quarn::findPlug("strip_skin.outputGeom[0]"));
        EXPECT_EQ(quarn::shownMeshes(), std::vector<HPlug>{strip.output});
        session->host().setTime(7.0);
        Frame input;
        quarn::readPoints(strip.input, input);
        EXPECT_EQ(input, right_[6]);
    }
    const std::string before = bytes(path("aimed.json"));
    Frames elsewhere = right_;
    for (Frame& frame : elsewhere)
        for (std::size_t i = 0; i < frame.size(); i += 3)
            frame[i] += 0.9F * static_cast<float>(i % 2);
    Frames less = right_;
    for (Frame& frame : less)
        frame.resize(frame.size() - 3);
    for (const auto& [skin, says] : {std::pair(place(elsewhere, "elsewhere.npy"), "where the skin is at rest"),
                                     std::pair(place(posed("other.json", "2"), "other.npy"), "do not belong"),
                                     std::pair(place(mixed(right_), "mixed.npy"), "--order rest"),
                                     std::pair(place(less, "less.npy"), "has 17 vertices, and strip has 18")})
        EXPECT_THAT(failureOf([&, &flags = skin] { connected(flags); }), HasSubstr(says));
    EXPECT_EQ(bytes(path("aimed.json")), before);
}

} // namespace
