// SPDX-License-Identifier: Apache-2.0
// Sliders move the same points and give the same controls as the nodes of a scene with the same rig.
#include "clients/viewer/core/SampleCharacter.h"
#include "host/support/testDeformers.h"
#include "plugin/controls/controlNodesPlugin.h"
#include "quarn/rig/RigTest.h"
#include "viewer/Character.h"

#include <array>
#include <charconv>
#include <span>

namespace {

using viewer::Shape;
using Words = std::vector<std::uint32_t>;

constexpr std::uint32_t none = 0xFFFFFFFF;
constexpr const char* channelNames[] = {"translateX",   "translateY",   "translateZ",   "rotateX", "rotateY", "rotateZ",
                                        "jointOrientX", "jointOrientY", "jointOrientZ", "scaleX",  "scaleY",  "scaleZ"};

template <class T>
std::string listOf(std::span<const T> values) {
    std::string list;
    for (const T value : values) {
        std::array<char, 32> digits{};
        list += ' ' + std::string(digits.data(), std::to_chars(digits.data(), digits.data() + 32, value).ptr);
    }
    return list;
}

template <class T>
std::string listOf(const std::vector<T>& values, std::size_t first, std::size_t count) {
    return listOf(std::span<const T>(values).subspan(first, count));
}

class ViewerRig : public RigTest {
protected:
    ViewerRig() { addControlNodes(); }

    /// Makes the nodes of the sample's rig, skin and shapes.
    void build(const SampleCharacter& sample) {
        values = sample.get<double>("rig.values");
        buildJoints(sample);
        buildShapes(sample);
        buildSkin(sample);
        buildConverters(sample);
    }

    void buildJoints(const SampleCharacter& sample) {
        const auto parents = sample.get<std::int32_t>("rig.parents");
        const auto orders = sample.get<std::uint32_t>("rig.orders");
        const auto channels = sample.get<double>("rig.channels"), rest = sample.get<double>("rig.rest"),
                   space = sample.get<double>("rig.space");
        for (std::size_t i = 0; i < parents.size(); ++i) {
            const std::string name = "j" + std::to_string(i);
            run("createNode joint -name " + name + "; setAttr " + name + ".rotateOrder " + std::to_string(orders[i]) +
                "; setAttr " + name + ".restMatrix" + listOf(rest, 16 * i, 16));
            run(parents[i] < 0
                    ? "setAttr " + name + ".parentMatrix" + listOf(space, 16 * i, 16)
                    : "connectAttr j" + std::to_string(parents[i]) + ".worldMatrix " + name + ".parentMatrix");
            for (std::size_t c = 0; c < 12; ++c)
                set({static_cast<std::uint32_t>(i), static_cast<std::uint32_t>(c)}, channels[12 * i + c]);
        }
    }

    void buildShapes(const SampleCharacter& sample) {
        const std::size_t n = sample.mesh().vertexCount();
        const auto points = sample.get<double>("skin.points"), deltas = sample.get<double>("shapes.deltas"),
                   ramps = sample.get<double>("rig.ramps");
        const auto counts = sample.get<std::uint32_t>("shapes.counts"),
                   vertices = sample.get<std::uint32_t>("shapes.vertices"),
                   factorCounts = sample.get<std::uint32_t>("rig.factorCounts"),
                   factors = sample.get<std::uint32_t>("rig.factors");
        weightValues = sample.get<std::uint32_t>("rig.weights");
        HPointArray positions;
        for (std::size_t v = 0; v < n; ++v)
            positions.append(HPoint(points[3 * v], points[3 * v + 1], points[3 * v + 2]));
        testDeformers::meshNode("mesh", HFnMeshData().create(positions, HIntArray{3}, HIntArray{0, 1, 2}));
        run("createNode blendShape -name b; connectAttr mesh.outMesh b.input[0].inputGeometry");
        for (std::size_t i = 0, first = 0, factor = 0; i < counts.size();
             first += counts[i], factor += factorCounts[i++]) {
            const std::string at = '[' + std::to_string(i) + "].";
            setList("b.shapes[0].shape" + at + "vertices",
                    {vertices.begin() + static_cast<std::ptrdiff_t>(first),
                     vertices.begin() + static_cast<std::ptrdiff_t>(first + counts[i])});
            setList("b.shapes[0].shape" + at + "deltas",
                    {deltas.begin() + static_cast<std::ptrdiff_t>(3 * first),
                     deltas.begin() + static_cast<std::ptrdiff_t>(3 * (first + counts[i]))});
            if (factorCounts[i] != 0)
                run("setAttr b.combination" + at + "factors" + listOf(factors, factor, factorCounts[i]) +
                    "; setAttr b.combination" + at + "ramps" +
                    listOf(ramps, 3 * factor, std::size_t{3} * factorCounts[i]));
        }
    }

    void buildSkin(const SampleCharacter& sample) {
        const auto joints = sample.get<std::uint32_t>("skin.joints");
        const auto binds = sample.get<double>("skin.binds");
        run("createNode skinCluster -name s; setAttr s.normalize off; connectAttr b.outputGeom[0] "
            "s.input[0].inputGeometry");
        for (std::size_t i = 0; i < joints.size(); ++i) {
            const std::string at = '[' + std::to_string(i) + ']';
            run("setAttr s.bindPreMatrix" + at + listOf(binds, 16 * i, 16));
            run(joints[i] == none ? "setAttr s.matrix" + at + " 1 0 0 0  0 1 0 0  0 0 1 0  0 0 0 1"
                                  : "connectAttr j" + std::to_string(joints[i]) + ".worldMatrix s.matrix" + at);
        }
        const auto asNumbers = [&](const char* name) {
            const auto words = sample.get<std::uint32_t>(name);
            return std::vector<double>(words.begin(), words.end());
        };
        setList("s.skin[0].influenceCounts", asNumbers("skin.counts"));
        setList("s.skin[0].influences", asNumbers("skin.influences"));
        setList("s.skin[0].skinWeights", sample.get<double>("skin.weights"));
    }

    /// A node for each converter of each joint's matrix that a control takes a number of.
    void buildConverters(const SampleCharacter& sample) {
        controls = sample.get<std::uint32_t>("rig.controls");
        const auto words = sample.get<std::uint32_t>("rig.converters");
        constexpr const char* switches[] = {"extractRotation", "extractScale", "extractTranslation",
                                            "rotationX",       "rotationY",    "rotationZ",
                                            "scaleX",          "scaleY",       "scaleZ",
                                            "translationX",    "translationY", "translationZ"};
        constexpr const char* matrices[] = {"relativeMatrix", "worldMatrix", "matrix"};
        for (std::size_t i = 0; 5 * i < controls.size(); ++i) {
            const std::uint32_t* control = controls.data() + 5 * i;
            const std::string name = "c" + std::to_string(i);
            if (control[0] == 1)
                run("createNode orthoAxisFromMatrixArray -name " + name);
            else if (control[0] == 2)
                run("createNode matrixConverter -name " + name);
            else
                continue;
            run("connectAttr j" + std::to_string(control[1]) + '.' + matrices[control[3]] + ' ' + name + ".input[0]");
            for (std::size_t bit = 0; control[0] == 2 && bit < 12; ++bit)
                run("setAttr " + name + '.' + switches[bit] +
                    (words[std::size_t{2} * control[4]] >> bit & 1U ? " on" : " off"));
            if (control[0] == 2)
                run("setAttr " + name + ".rotationConversion " +
                    std::to_string(words[std::size_t{2} * control[4] + 1]));
        }
    }

    /// Sets what a slider or an animated value sets.
    void set(const std::array<std::uint32_t, 2>& place, double value) {
        if (place[0] == none)
            values[place[1]] = value;
        else
            run("setAttr j" + std::to_string(place[0]) + '.' + channelNames[place[1]] +
                listOf(std::span<const double>(&value, 1)));
    }

    /// The value of a control, as the nodes have it.
    double control(std::size_t i) const {
        const std::uint32_t* word = controls.data() + 5 * i;
        const std::string name = "c" + std::to_string(i), at = '[' + std::to_string(word[2]) + ']';
        switch (word[0]) {
        case 1:
            return number(name + ".outputList[0].output" + at);
        case 2:
            OpenQuarn::evaluate(testNodes::plug(name + ".flatOutput"));
            return number(name + ".flatOutput" + at);
        case 3:
            return values[word[1]];
        case 4:
            return number("j" + std::to_string(word[1]) + '.' + channelNames[word[2]]);
        default:
            return 0.25;
        }
    }

    std::vector<double> values;
    Words controls, weightValues;
};

TEST_F(ViewerRig, GivesPointsAndControlsOfTheScene) {
    for (std::uint32_t seed = 1; seed <= 6; ++seed) {
        run("file -new");
        const SampleCharacter sample({.seed = seed, .controls = 16});
        build(sample);
        viewer::Character character(sample.blocks());
        const auto sliders = sample.get<std::uint32_t>("rig.sliders"),
                   animated = sample.get<std::uint32_t>("rig.animated");
        const auto ofAnimated = sample.get<double>("frames.animated"), ofSliders = sample.get<double>("frames.sliders");
        for (std::size_t frame = 0; frame < 3; ++frame) {
            const std::vector<double> given(ofSliders.begin() + static_cast<std::ptrdiff_t>(6 * frame),
                                            ofSliders.begin() + static_cast<std::ptrdiff_t>(6 * frame + 6));
            for (std::size_t i = 0; i < 2; ++i)
                set({animated[2 * i], animated[2 * i + 1]}, ofAnimated[2 * frame + i]);
            for (std::size_t i = 0; i < given.size(); ++i)
                set({sliders[2 * i], sliders[2 * i + 1]}, given[i]);
            for (std::size_t i = 0; i < weightValues.size(); ++i)
                if (weightValues[i] != none)
                    run("setAttr b.weight[" + std::to_string(i) + ']' + listOf(values, weightValues[i], 1));
            character.showSliders(frame, given);
            for (std::size_t i = 0; i < character.controlCount(); ++i)
                EXPECT_EQ(character.controls()[i], static_cast<float>(control(i))) << seed << ' ' << frame << ' ' << i;
            const std::vector<HPoint> expected = testDeformers::points(testNodes::plug("s.outputGeom[0]"));
            const auto points = character.points(Shape::skin);
            ASSERT_EQ(3 * expected.size(), points.size());
            for (std::size_t v = 0; v < expected.size(); ++v)
                EXPECT_TRUE(points[3 * v] == static_cast<float>(expected[v].x) &&
                            points[3 * v + 1] == static_cast<float>(expected[v].y) &&
                            points[3 * v + 2] == static_cast<float>(expected[v].z))
                    << seed << ' ' << frame << ' ' << v;
        }
    }
}

} // namespace
