// SPDX-License-Identifier: Apache-2.0
// Training deltas, as the command gives them: the deformer undoes them.
#include "deformer/TargetDeltaType.h"
#include "frame/smoothing.h"
#include "plugin/deformer/support/WarpTest.h"
#include "plugin/deformer/sweep.h"

#include <cmath>
#include <limits>
#include <tuple>

namespace {

using Vertices = std::optional<std::vector<unsigned>>; ///< none: all of them

struct Pose {
    HPointArray rest, input, target;
};

/// One geometry whose export settings, target and model are all of the test's making.
class Inversion : public WarpTest {
protected:
    void build(const ZooMesh& zooMesh, const Vertices& affectedVertices, const Pose& wanted) {
        session.newScene();
        mesh = warpRig::mesh(zooMesh);
        pose = wanted;
        affected = affectedVertices;
        rig.emplace();
        rig->addGeometry(0, {.mesh = warpRig::withPoints(mesh, pose.input),
                             .rest = warpRig::withPoints(mesh, pose.rest),
                             .affected = affected,
                             .modelOn = false});
        rig->setTarget(0, warpRig::withPoints(mesh, pose.target));
        rig->setModelRoot(folder.path());
        rig->setControls({0.0});
        ASSERT_EQ(rig->deform(0), HStatus::kSuccess);
    }

    void startExport(unsigned deltaMode, std::size_t smoothing) {
        script("setAttr warp1.export[0].deltaMode " + std::to_string(deltaMode) +
               "; setAttr warp1.export[0].smoothingIterations " + std::to_string(smoothing) +
               "; neuralWarp warp1 -exportActive on");
    }

    std::vector<float> deltas(const std::string& code) {
        const auto values = std::get<std::vector<double>>(script("neuralWarp warp1 -vertexDeltas " + code));
        return {values.begin(), values.end()};
    }

    /// The geometry under a model whose one shape are the deltas.
    HPointArray applied(const std::vector<float>& shape, unsigned deltaMode, unsigned smoothing) {
        ModelSpec spec;
        spec.shapes = {shape};
        spec.deltaMode = deltaMode;
        spec.smoothingIterations = smoothing;
        spec.fullCount = pose.input.length();
        spec.affectCount = static_cast<unsigned>(shape.size() / 3);
        if (affected) {
            spec.subsetState = "partial";
            spec.affectMap.assign(affected->begin(), affected->end());
        }
        writeModel(modelDirectory(), spec);
        script("neuralWarp warp1 -exportActive off -reloadModel; setAttr warp1.models[0].modelActive On");
        EXPECT_EQ(rig->deform(0), HStatus::kSuccess);
        EXPECT_TRUE(rig->state(0)->modelApplied);
        return rig->result(0);
    }

    /// Everything that an extraction has to leave as it is.
    auto snapshot() const {
        const neuralWarp::neuralWarpData& d = *rig->state(0);
        return std::make_tuple(d.framesTopologyDirty, d.indexMapDirty, d.connectionsDirty, d.restFramesDirty,
                               d.modelApplied, d.exportMode, d.modelLoadPending, d.metadataDirty, d.modelPathDirty,
                               d.cacheVersions, d.vertexFrames.framesPairs(), d.vertexFrames.framesIndexer(),
                               d.vertexConnections.connections(), d.connectionWeights.get(), d.restPoints.get(),
                               d.restFramesInverse.get());
    }

    HObject mesh;
    Pose pose;
    Vertices affected;
    std::optional<warpRig::Rig> rig;
};

/// Vertices whose frames are rotations, up to a mirror image, with the settings in force. Where the smoothed surface
/// has no area around a vertex, it has no such frame there, and what went into it cannot be had back.
std::vector<bool> regularVertices(const neuralWarp::neuralWarpData& state, const Pose& pose) {
    const std::size_t count = state.componentMap.affectCount();
    std::vector<bool> regular(count, true);
    for (const HPointArray& all : {pose.rest, pose.input}) {
        neuralWarp::Points points;
        for (std::size_t k = 0; k < count; ++k) {
            const HPoint& p = all[state.componentMap.toFull(k)];
            points.emplace_back(static_cast<float>(p.x), static_cast<float>(p.y), static_cast<float>(p.z));
        }
        neuralWarp::smoothPoints(points, state.frameModel().rest, state.activeSettings.smoothingIterations);
        std::vector<quill::mat4d> frames;
        state.vertexFrames.calculateFrames(frames, points, state.componentMap, false, nullptr);
        for (std::size_t i = 0; i < count; ++i)
            regular[i] = regular[i] && std::abs(std::abs(frames[i].determinant()) - 1.0) < 1e-3;
    }
    return regular;
}

double largest(const HPointArray& points) {
    double found = 0.0;
    for (const HPoint& p : points)
        found = std::max({found, std::abs(p.x), std::abs(p.y), std::abs(p.z)});
    return found;
}

double distance(const HPoint& a, const HPoint& b) {
    return std::max({std::abs(a.x - b.x), std::abs(a.y - b.y), std::abs(a.z - b.z)});
}

TEST_F(Inversion, TheDeformerReturnsTheTargetFromWhatTheCommandExtracts) {
    Dice dice(11);
    std::size_t returned = 0, singular = 0, singularBefore = 0;
    const auto check = [&](const ZooMesh& zooMesh, std::size_t smoothing) {
        for (const unsigned mode : {1U, 0U}) {
            script("setAttr warp1.models[0].modelActive Off");
            startExport(mode, smoothing);
            deltas("dbp");
            const auto before = snapshot(); // the caches that the settings ask for are there now
            for (const std::string code : {"dop", "dbs", "pos", "dos"}) {
                EXPECT_EQ(deltas(code).size(), 3 * rig->state(0)->componentMap.affectCount());
                EXPECT_EQ(snapshot(), before) << code;
            }
            const quill::IndexMapper map = rig->state(0)->componentMap;
            std::vector<bool> regular(map.affectCount(), true);
            if (mode == 1)
                regular = regularVertices(*rig->state(0), pose);
            const std::vector<float> shape = deltas(mode == 1 ? "dos" : "dbp");
            const HPointArray result = applied(shape, mode, static_cast<unsigned>(smoothing));
            HPointArray wanted = pose.input;
            const double size = std::max({largest(pose.rest), largest(pose.input), largest(pose.target)});
            const double rounding = 16 * std::numeric_limits<float>::epsilon() * size;
            for (std::size_t k = 0; k < regular.size(); ++k) {
                const unsigned v = map.toFull(k);
                wanted[v] = result[v];
                (regular[k] ? returned : singular) += 1;
                if (regular[k]) {
                    EXPECT_LE(distance(result[v], pose.target[v]), rounding) << "vertex " << v << ", mode " << mode;
                }
            }
            EXPECT_EQ(firstDifference(result, wanted), wanted.length()) << "a vertex that is not affected moved";
            // outside of an export, the settings are the model's
            startExport(1 - mode, smoothing + 1);
            script("neuralWarp warp1 -exportActive off");
            EXPECT_EQ(deltas(mode == 1 ? "dos" : "dbp"), shape);
        }
        if (!zooMesh.degenerate && smoothing == 0) {
            EXPECT_EQ(singular, singularBefore);
        }
        singularBefore = singular;
    };
    for (const ZooMesh& zooMesh : meshZoo()) {
        const std::size_t count = zooMesh.vertexCount();
        for (unsigned variant = 0; count != 0 && variant < 12; ++variant) {
            const HPointArray base = warpRig::pointsOf(warpRig::mesh(zooMesh));
            const bool isMoved = variant % 2 == 0, isPartial = variant % 4 < 2;
            const Pose poses = {isMoved ? dice.moved(base, 0.03) : base, isMoved ? dice.moved(base, 0.05) : base,
                                dice.moved(base, 0.3)};
            const Vertices part = isPartial ? Vertices(dice.chosen(1 + count * 3 / 4, count)) : std::nullopt;
            SCOPED_TRACE(zooMesh.name + ", variant " + std::to_string(variant));
            ASSERT_NO_FATAL_FAILURE(build(zooMesh, part, poses));
            ASSERT_NO_FATAL_FAILURE(check(zooMesh, std::vector<std::size_t>{0, 1, 10}.at(variant / 4)));
            ASSERT_FALSE(HasFailure());
        }
    }
    EXPECT_LT(50 * singular, returned) << singular << " of " << returned + singular << " were not looked at";
}

} // namespace
