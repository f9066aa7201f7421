// SPDX-License-Identifier: Apache-2.0
// nw_deform gives, to the bit, what the node gives in a host, rounded to single precision.
#include "nw_deform/deformCharacters.h"
#include "plugin/Dice.h"
#include "plugin/deformer/support/WarpTest.h"

#include <memory>
#include <vector>

namespace {

using neuralWarp::Points;

class WithoutHost : public WarpTest {};

/// The polygons that a host has.
quill::MeshTopology hostTopology(const ZooMesh& mesh) {
    std::vector<std::vector<std::uint32_t>> polygons;
    for (const auto& polygon : mesh.polygons)
        if (polygon.size() >= 3)
            polygons.push_back(polygon);
    return makeTopology(polygons, mesh.vertexCount());
}

/// A model of `vertices`, which drives all or every other one from behind, by deltas or by shapes.
ModelSpec modelOf(Dice& dice, std::size_t vertices, std::uint32_t mode, std::uint32_t passes, bool isPartial,
                  bool hasShapes) {
    ModelSpec spec;
    spec.controls = 2;
    spec.deltaMode = mode;
    spec.smoothingIterations = passes;
    spec.fullCount = static_cast<std::uint32_t>(vertices);
    if (isPartial) {
        spec.subsetState = "partial";
        for (std::size_t v = vertices; v-- > 0;)
            if (v % 2 == 0)
                spec.affectMap.push_back(static_cast<std::uint32_t>(v));
    }
    const std::size_t slots = isPartial ? spec.affectMap.size() : vertices;
    spec.affectCount = static_cast<std::uint32_t>(slots);
    const std::size_t outputs = hasShapes ? 3 : 3 * slots;
    spec.bias = dice.floats(outputs, 1.0);
    spec.weights = dice.floats(2 * outputs, 1.0);
    for (int shape = 0; hasShapes && shape < 3; ++shape)
        spec.shapes.push_back(dice.floats(3 * slots, 1.0));
    return spec;
}

/// The first coordinate that differs, or the number of coordinates.
std::size_t firstDifference(const HPointArray& host, const std::vector<float>& own) {
    std::size_t i = 0;
    const auto coordinate = [&](std::size_t at) {
        const HPoint& point = host[static_cast<unsigned>(at / 3)];
        return static_cast<float>(at % 3 == 0 ? point.x : at % 3 == 1 ? point.y : point.z);
    };
    while (i < own.size() && coordinate(i) == own[i])
        ++i;
    return i;
}

TEST_F(WithoutHost, FramesHaveTheBitsOfTheNode) {
    Dice dice(197);
    std::vector<ZooMesh> meshes = meshZoo();
    meshes.push_back(makeGrid(40, 30)); // large enough for a network beside the points
    for (std::size_t i = 0; i < meshes.size(); ++i) {
        const ZooMesh& mesh = meshes[i];
        if (mesh.vertexCount() == 0)
            continue;
        const bool isLast = i + 1 == meshes.size(); // of all kinds, the others of some
        for (auto kind = isLast ? 0U : static_cast<unsigned>(i % 5); kind < 16; kind += isLast ? 1 : 5) {
            const bool isPartial = (kind & 4U) != 0;
            SCOPED_TRACE(mesh.name + ", kind " + std::to_string(kind));
            writeModel(modelDirectory(), modelOf(dice, mesh.vertexCount(), kind & 1U, (kind & 2U) != 0 ? 3 : 0,
                                                 isPartial, (kind & 8U) != 0));
            const std::vector<float> weights =
                dice.oneIn(2) ? dice.floats(mesh.vertexCount(), 1.0) : std::vector<float>();
            const float envelope = dice.oneIn(2) ? 1.0F : 0.3F;
            std::vector<float> points;
            std::vector<float> out(3 * mesh.vertexCount());
            HPointArray moved;
            for (auto p : mesh.points) {
                const std::vector<float> move = dice.floats(3, 0.2);
                p += quill::val3<float>{move[0], move[1], move[2]};
                points.insert(points.end(), {p.x, p.y, p.z});
                moved.append(HPoint(p.x, p.y, p.z));
            }

            session.newScene();
            warpRig::Rig rig;
            const HObject rest = warpRig::mesh(mesh);
            rig.addGeometry(0, {.mesh = warpRig::withPoints(rest, moved), .rest = rest, .weights = weights});
            rig.setModelRoot(folder.path());
            rig.setControls({0.5, -0.75});
            ASSERT_FALSE(rig.plug("envelope").setFloat(envelope).error());
            ASSERT_EQ(rig.deform(0), HStatus::kSuccess);
            takeMessages();

            const auto model = neuralWarp::Model::load(modelDirectory());
            neuralWarp::Deformer deformer(model, hostTopology(mesh), mesh.points);
            const std::vector<float> controls{0.5F, -0.75F};
            const neuralWarp::Pose pose{points.data(), controls, envelope, weights.empty() ? nullptr : weights.data()};
            deformer.evaluate(pose, out.data());
            EXPECT_EQ(firstDifference(rig.result(0), out), out.size());
            std::vector<float> beside(out.size());
            const neuralWarp::CharacterFrame character{&deformer, pose, beside.data()};
            neuralWarp::deformCharacters({&character, 1});
            EXPECT_EQ(beside, out);
        }
    }
}

} // namespace
