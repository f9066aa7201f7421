// SPDX-License-Identifier: Apache-2.0
// A test that makes scenes of characters.
#pragma once

#include "quarn/import/RandomCharacter.h"
#include "quarn/import/animationCurves.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <functional>
#include <stdexcept>

namespace quarn {

constexpr double testFrameRate = 20.0;

inline void findDeformer() {
    ::setenv("NEURALWARP_PLUGIN", NW_PLUGIN, 1);
}

inline std::vector<double> pointsOf(const HPlug& plug) {
    std::vector<double> points;
    readPoints(plug, points);
    return points;
}

inline void expectNear(const std::vector<double>& points, std::size_t vertex, const HPoint& wanted) {
    EXPECT_NEAR(points[3 * vertex], wanted.x, 1e-6) << vertex;
    EXPECT_NEAR(points[3 * vertex + 1], wanted.y, 1e-6) << vertex;
    EXPECT_NEAR(points[3 * vertex + 2], wanted.z, 1e-6) << vertex;
}

/// A session with the scene of a character.
class TestScene {
public:
    TestScene(const Character& character, const Animation* animation)
        : character_(character)
        , rests_((findDeformer(), splitRests(character, animation)))
        , scene_(buildScene(character, rests_)) {
        if (animation != nullptr)
            addAnimation(character, *animation, rests_, testFrameRate, scene_);
    }

    /// Every skinned vertex is where the plain formula has it, at rest (seconds below 0) or in the animation.
    void expectPlain(double seconds) {
        if (seconds >= 0.0)
            setSeconds(seconds);
        const std::vector<HMatrix> worlds = plainWorlds(character_, seconds);
        for (std::size_t m = 0; m < character_.meshes.size(); ++m) {
            const CharacterMesh& mesh = character_.meshes[m];
            const std::vector<double> points = pointsOf(plugOf(scene_.meshes[m].skin, "outputGeom[0]"));
            for (std::size_t v = 0; v < mesh.points.size(); ++v)
                if (!mesh.influences[v].empty())
                    expectNear(points, v, plainPoint(mesh, worlds, v));
        }
    }

    /// The skins leave the rest meshes where they are.
    void expectStill() {
        for (const SceneMesh& mesh : scene_.meshes) {
            const std::vector<double> rest = pointsOf(plugOf(mesh.mesh, "outMesh"));
            EXPECT_THAT(pointsOf(plugOf(mesh.skin, "outputGeom[0]")),
                        testing::Pointwise(testing::DoubleNear(1e-9), rest));
        }
    }

    void setSeconds(double seconds) { session_.host().setTime(frameOf(seconds, testFrameRate)); }
    const CharacterScene& scene() const { return scene_; }

private:
    const Character& character_;
    std::vector<JointRest> rests_; // finds the deformer, which the session needs
    SceneSession session_;
    CharacterScene scene_;
};

} // namespace quarn
