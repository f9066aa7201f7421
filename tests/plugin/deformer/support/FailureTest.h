// SPDX-License-Identifier: Apache-2.0
// A deformer that is made to fail: what it said, and where its points are, to the last bit.
#pragma once

#include "deformer/neuralWarpNode.h"
#include "plugin/deformer/support/WarpTest.h"
#include "plugin/deformer/support/stateText.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Evaluation.h"

#include <array>
#include <optional>
#include <regex>
#include <string>
#include <vector>

class FailureTest : public WarpTest {
public: // tables of what to spoil are lambdas, which get the test
    using WarpTest::folder;
    using WarpTest::modelDirectory;
    using Texts = std::vector<std::string>;
    using Coordinates = std::vector<std::array<double, 3>>;

    /// Points that a float cannot hold, so that a vertex which was rounded shows.
    static HObject unevenMesh(std::size_t columns = 2, std::size_t rows = 2) {
        const HObject grid = warpRig::mesh(makeGrid(columns, rows));
        HPointArray points = warpRig::pointsOf(grid);
        for (unsigned i = 0; i < points.length(); ++i)
            points[i] = {points[i].x + 0.1 + 1e-9 * i, points[i].y + 0.3, points[i].z - 0.7};
        return warpRig::withPoints(grid, points);
    }

    /// A model of that mesh that moves every vertex differently.
    static ModelSpec modelSpec(std::uint32_t vertexCount = 9) {
        ModelSpec spec;
        spec.fullCount = spec.affectCount = vertexCount;
        spec.bias.resize(std::size_t{3} * vertexCount);
        for (std::size_t i = 0; i < spec.bias.size(); ++i)
            spec.bias[i] = 0.125F * static_cast<float>(i + 1);
        return spec;
    }

    static Coordinates coordinates(const HPointArray& points) {
        Coordinates all;
        all.reserve(points.length());
        for (const HPoint& p : points)
            all.push_back({p.x, p.y, p.z});
        return all;
    }
    static Coordinates came() { return coordinates(warpRig::pointsOf(unevenMesh())); }
    /// What the blend leaves without a model: each coordinate goes part of the way to its value in single precision.
    static Coordinates rounded() { return rounded(came()); }
    static Coordinates rounded(Coordinates points) {
        for (std::array<double, 3>& point : points)
            for (double& x : point) {
                const auto single = static_cast<float>(x);
                x += static_cast<double>(single) - x;
            }
        return points;
    }
    static Coordinates result(const warpRig::Rig& of) { return coordinates(of.result(0)); }

    /// A new scene with one geometry, whose model is switched on.
    void makeRig(const HObject& mesh = unevenMesh()) {
        session.newScene();
        rig.emplace();
        rig->addGeometry(0, {.mesh = mesh});
        rig->setModelRoot(folder.path());
        rig->setControls({1.0});
    }
    /// Writes the model of modelSpec(), changed.
    template <class Change>
    void writeChanged(Change change) const {
        ModelSpec spec = modelSpec();
        change(spec);
        writeModel(modelDirectory(), spec);
    }

    static neuralWarp::neuralWarpNode& nodeOf(const warpRig::Rig& of) {
        return dynamic_cast<neuralWarp::neuralWarpNode&>(*HFnDependencyNode(of.node).userNode());
    }

    /// What was shown, with ROOT for the test's folder and N for numbers of source lines.
    Texts shown() {
        Texts texts = takeMessages();
        for (std::string& text : texts)
            text = std::regex_replace(withoutFolder(text), std::regex(", line [0-9]+:"), ", line N:");
        // files share a tag: what tells their reports apart is the text
        EXPECT_THAT(texts, testing::Each(testing::Not(testing::ContainsRegex("line N: (failure|invalid parameter)$"))));
        return texts;
    }
    std::string withoutFolder(const std::string& text) const {
        return std::regex_replace(text, std::regex(folder.path().string()), "ROOT");
    }
    static std::string report(const std::string& reason, const char* unit = "neuralWarp/neuralWarpNode") {
        return "report: API error in " + std::string(unit) + ", line N: " + reason;
    }

    std::optional<warpRig::Rig> rig;
};
