// SPDX-License-Identifier: Apache-2.0
// Whole evaluations, from a model directory to moved points, against the formulas.
#include "openquarn_app/Evaluation.h"
#include "plugin/deformer/reference.h"
#include "plugin/deformer/support/SeenOutputs.h"
#include "plugin/deformer/support/WarpTest.h"
#include "plugin/deformer/sweep.h"

#include <tbb/task_arena.h>

#include <set>

namespace {

using testing::AllOf;
using testing::Contains;
using testing::HasSubstr;

class Evaluation : public WarpTest {};

/// A deformer with three geometries, and what it should make of them. Each step changes something by chance, evaluates
/// all three and compares.
class Walk {
public:
    Walk(const std::filesystem::path& folder, const ZooMesh& mesh, const ZooMesh& other, std::uint32_t seed);
    void step();

    std::set<std::string> seen; ///< what a model was applied with

private:
    struct Driven {
        unsigned index;
        HObject mesh;
        HPointArray base;
        expected::Vertices affected;
        expected::Geometry reference;
        expected::Request request = {};
        ModelSpec model = {};
        std::string subset = {};
        SeenOutputs outputs = {};
    };

    void add(unsigned index, const ZooMesh& mesh, const expected::Vertices& affected, bool isWeighted);
    void change();
    void changePoints(Driven& driven);
    void changeControls();
    void changeEnvelope();
    void changeMorph();
    void changeExport(Driven& driven);
    void reload(Driven& driven);
    void writeModelOf(Driven& driven);
    void chooseSubset(Driven& driven);
    void compare(Driven& driven);
    std::string at(const char* attribute, const Driven& driven) const {
        return attribute + ("[" + std::to_string(driven.index) + "]");
    }
    std::string modelName(const Driven& driven) const { return "model" + std::to_string(driven.index); }

    tbb::task_arena alone_{1}; // a single thread gets the largest pieces of work
    std::filesystem::path folder_;
    Dice dice_;
    warpRig::Rig rig_;
    std::vector<Driven> all_;
};

Walk::Walk(const std::filesystem::path& folder, const ZooMesh& mesh, const ZooMesh& other, std::uint32_t seed)
    : folder_(folder)
    , dice_(seed) {
    const std::size_t count = mesh.vertexCount();
    all_.reserve(3);
    add(0, mesh, {}, false);
    const std::vector<unsigned> part = dice_.chosen(std::max<std::size_t>(1, count * 2 / 3), count);
    add(1, mesh, part, dice_.oneIn(2));
    add(4, other, {}, true);
    rig_.setModelRoot(folder);
    changeControls();
    for (Driven& driven : all_) { // after this there are states, which changes can be asked of
        compare(driven);
        rig_.state(driven.index)->observer = &driven.outputs;
    }
}

void Walk::add(unsigned index, const ZooMesh& mesh, const expected::Vertices& affected, bool isWeighted) {
    const HObject held = warpRig::mesh(mesh);
    const HPointArray base = warpRig::pointsOf(held);
    const HPointArray rest = dice_.moved(base, 0.05);
    all_.push_back({index, held, base, affected, expected::Geometry(mesh, affected)});
    Driven& driven = all_.back();
    driven.request.input = base;
    driven.request.rest = rest;
    driven.request.morphTarget = dice_.moved(base, 0.2);
    if (isWeighted)
        driven.request.weights = dice_.floats(mesh.vertexCount(), 1.7);
    writeModelOf(driven);
    rig_.addGeometry(index, {.mesh = held,
                             .rest = warpRig::withPoints(held, rest),
                             .affected = affected,
                             .weights = driven.request.weights,
                             .modelName = modelName(driven)});
    rig_.setMorphTarget(index, warpRig::withPoints(held, driven.request.morphTarget));
    driven.mesh = rig_.plug(at("input", driven) + ".inputGeometry").asHObject(); // with its component tag
}

void Walk::chooseSubset(Driven& driven) {
    const std::size_t full = driven.base.length();
    ModelSpec& model = driven.model;
    const std::vector<unsigned> all = dice_.chosen(full, full);
    driven.subset = dice_.pick({"complete", "complete", "same", "same", "other", "other", "outside", "empty", "what?"});
    model.subsetState = driven.subset;
    if (driven.subset == "same" || driven.subset == "other" || driven.subset == "outside")
        model.subsetState = "partial";
    model.affectMap.clear();
    for (const unsigned vertex : all) {
        const bool isDeformed =
            !driven.affected || std::count(driven.affected->begin(), driven.affected->end(), vertex) != 0;
        if (driven.subset == "other" ? dice_.oneIn(2) : driven.subset == "outside" && !isDeformed)
            model.affectMap.push_back(vertex);
    }
    if (driven.subset == "same" && driven.affected)
        model.affectMap.assign(driven.affected->begin(), driven.affected->end());
    else if (driven.subset == "same")
        for (unsigned vertex = 0; vertex < full; ++vertex)
            model.affectMap.push_back(vertex);
}

void Walk::writeModelOf(Driven& driven) {
    ModelSpec& model = driven.model;
    chooseSubset(driven);
    const std::size_t slots =
        std::max<std::size_t>(1, driven.subset == "complete" ? driven.base.length() : model.affectMap.size());
    model.fullCount = driven.base.length();
    model.affectCount = driven.affected ? static_cast<unsigned>(driven.affected->size()) : driven.base.length();
    model.deltaMode = dice_.below(2);
    model.smoothingIterations = dice_.pick({0U, 1U, 23U});
    model.shapes.resize(dice_.pick({0U, 0U, 0U, 1U, 2U, 9U}));
    for (std::vector<float>& shape : model.shapes)
        shape = dice_.floats(3 * slots, 0.3);
    const std::size_t needed = model.shapes.empty() ? 3 * slots : model.shapes.size();
    dice_.fillNetwork(model, needed + dice_.below(2));
    writeModel(folder_ / (modelName(driven) + ".nwrp"), model);
}

void Walk::changePoints(Driven& driven) {
    const HPointArray points = dice_.moved(driven.base, dice_.pick({0.0, 0.04, 0.3}));
    const HObject mesh = warpRig::withPoints(driven.mesh, points);
    switch (dice_.below(4)) {
    case 0:
        rig_.setRest(driven.index, mesh);
        driven.request.rest = points;
        break;
    case 1:
        rig_.setMorphTarget(driven.index, mesh);
        driven.request.morphTarget = points;
        break;
    default:
        rig_.setInput(driven.index, mesh);
        driven.request.input = points;
    }
}

void Walk::changeControls() {
    std::vector<double> controls(3 + dice_.below(3)); // no fewer than the network takes
    for (double& value : controls)
        value = dice_.real(0.4);
    rig_.setControls(controls);
    for (Driven& driven : all_)
        driven.request.controls = controls;
}

void Walk::changeMorph() {
    const bool isOn = !dice_.oneIn(3);
    const std::string envelope = dice_.pick({"0", "0.5e-6", "0.25", "0.25", "1"});
    script("setAttr warp1.targetMorphEnabled " + std::to_string(isOn) + "; setAttr warp1.targetMorphEnvelope " +
           envelope);
    for (Driven& driven : all_) {
        driven.request.morphOn = isOn;
        driven.request.morphEnvelope = std::stod(envelope);
    }
}

void Walk::changeExport(Driven& driven) {
    driven.request.exportMode = dice_.oneIn(3);
    const std::string settings = "setAttr warp1." + at("export", driven);
    script(settings + ".deltaMode " + dice_.pick({"0", "1"}) + ";" + settings + ".smoothingIterations 2");
    script("neuralWarp warp1 -multiIndex " + std::to_string(driven.index) + " -exportActive " +
           std::to_string(driven.request.exportMode));
}

void Walk::changeEnvelope() {
    const std::string envelope = dice_.pick({"1", "1", "0.5", "-0.4", "1.75", "0"});
    script("setAttr warp1.envelope " + envelope);
    for (Driven& driven : all_)
        driven.request.envelope = std::stof(envelope);
}

void Walk::reload(Driven& driven) {
    writeModelOf(driven);
    if (driven.index != 4 && dice_.oneIn(2)) {
        script("setAttr warp1." + at("models", driven) + ".modelName " + modelName(driven));
        for (Driven& each : all_)
            if (each.index < all_.size()) // the reach of an attribute
                each.reference.requestReload();
    } else {
        script("neuralWarp warp1 -reloadModel -multiIndex " + std::to_string(driven.index));
        driven.reference.requestReload();
    }
}

void Walk::change() {
    Driven& driven = all_[dice_.below(all_.size())];
    switch (dice_.below(12)) {
    case 0:
        return changeEnvelope();
    case 1:
        driven.request.modelOn = !dice_.oneIn(3);
        script("setAttr warp1." + at("models", driven) + ".modelActive " + std::to_string(driven.request.modelOn));
        return;
    case 2:
        return changeControls();
    case 3:
        return changeMorph();
    case 4:
        return changeExport(driven);
    case 5:
    case 6:
    case 7:
        return changePoints(driven);
    default:
        return reload(driven);
    }
}

void Walk::compare(Driven& driven) {
    const auto deform = [&] { return rig_.deform(driven.index); };
    EXPECT_EQ(dice_.oneIn(2) ? alone_.execute(deform) : deform(), HStatus::kSuccess);
    const HPointArray result = rig_.result(driven.index);
    const HPointArray wanted = driven.reference.evaluate(driven.request, driven.model);
    ASSERT_EQ(firstDifference(result, wanted), wanted.length())
        << "mode " << driven.model.deltaMode << ", " << driven.model.smoothingIterations << " passes, "
        << driven.model.shapes.size() << " shapes, " << driven.subset;
    EXPECT_EQ(rig_.state(driven.index)->modelApplied, driven.reference.modelApplied());
    if (driven.request.envelope == 0.0F || rig_.state(driven.index)->observer != &driven.outputs)
        return;
    const bool isApplied = driven.reference.modelApplied();
    EXPECT_EQ(driven.outputs.values,
              isApplied ? expected::outputsOf(driven.model, driven.request.controls) : std::vector<float>());
    if (!isApplied)
        return;
    const ModelSpec& model = driven.model;
    seen.insert("model " + std::to_string(model.deltaMode) + " " + std::to_string(model.smoothingIterations) +
                (model.shapes.empty() ? " direct" : " shapes") +
                (driven.reference.usesAffectMap() ? " mapped" : " plain"));
    seen.insert("morph " + std::to_string(driven.request.morphOn) + " " +
                std::to_string(driven.request.morphEnvelope * 1e7));
    seen.insert("envelope " + std::to_string(driven.request.envelope));
}

void Walk::step() {
    for (unsigned changes = 1 + dice_.below(3); changes > 0; --changes)
        change();
    for (Driven& driven : all_) {
        SCOPED_TRACE("geometry " + std::to_string(driven.index));
        compare(driven);
    }
}

TEST_F(Evaluation, IsWhatTheFormulasSayWhateverWasBefore) {
    std::set<std::string> seen;
    std::vector<ZooMesh> meshes = meshZoo();
    meshes.erase(std::remove_if(meshes.begin(), meshes.end(), [](const ZooMesh& m) { return m.points.empty(); }),
                 meshes.end());
    ASSERT_GE(meshes.size(), 15U);
    meshes.push_back(shuffled(makeGrid(60, 50), 3)); // enough for more than a handful of vertices at a time
    for (std::uint32_t m = 0; m < meshes.size(); ++m) {
        session.newScene();
        Walk walk(folder.path(), meshes[m], meshes[(m + 1) % meshes.size()], m);
        for (int step = 0; step < 40; ++step) {
            SCOPED_TRACE(meshes[m].name + ", step " + std::to_string(step));
            ASSERT_NO_FATAL_FAILURE(walk.step());
            ASSERT_FALSE(HasFailure());
        }
        seen.merge(walk.seen);
        EXPECT_THAT(takeMessages(), testing::Each(testing::StartsWith("warning: "))); // of models for other vertices
    }
    const auto kinds = [&](const std::string& kind) {
        return std::count_if(seen.begin(), seen.end(), [&](const std::string& s) { return s.rfind(kind, 0) == 0; });
    };
    EXPECT_EQ(kinds("model "), 2 * 3 * 2 * 2) << "the walks did not come by every kind of model";
    EXPECT_EQ(kinds("morph 1 "), 3); // at 1 the model has no say
    EXPECT_EQ(kinds("envelope "), 4);
}

/// A quad that a model with four controls moves in x: by the first control, the second and so on.
class FourControls : public WarpTest {
protected:
    FourControls() {
        ModelSpec spec;
        spec.controls = 4;
        spec.bias.assign(12, 0.0F);
        spec.weights.assign(48, 0.0F);
        for (std::size_t vertex = 0; vertex < 4; ++vertex)
            spec.weights[12 * vertex + 3 * vertex] = 1.0F;
        spec.deltaMode = 0;
        spec.fullCount = spec.affectCount = 4;
        writeModel(modelDirectory(), spec);
        rig.addGeometry(0, {.mesh = quad});
        rig.setModelRoot(folder.path());
    }

    HObject quad = warpRig::mesh(makeGrid(1, 1));
    warpRig::Rig rig;
};

TEST_F(FourControls, AreTakenByTheirPosition) {
    const std::vector<unsigned> indices = {7, 2, 30, 11, 12}; // made in this order
    for (const unsigned index : indices)
        ASSERT_FALSE(rig.plug("controlValues[" + std::to_string(index) + "]").setDouble(index).error());
    ASSERT_EQ(rig.deform(0), HStatus::kSuccess);
    const HPointArray before = warpRig::pointsOf(quad);
    const HPointArray after = rig.result(0);
    const std::vector<double> expectedMoves = {2, 7, 11, 12};
    for (unsigned vertex = 0; vertex < 4; ++vertex)
        EXPECT_FLOAT_EQ(static_cast<float>(after[vertex].x - before[vertex].x),
                        static_cast<float>(expectedMoves[vertex]));
}

TEST_F(FourControls, ThreeAreTooFew) {
    rig.setControls({1, 2, 3});
    EXPECT_EQ(rig.deform(0), HStatus::kFailure);
    EXPECT_EQ(firstDifference(rig.result(0), warpRig::pointsOf(quad)), 4U);
    EXPECT_THAT(takeMessages(), Contains(AllOf(HasSubstr("error: [NEURAL WARP]"), HasSubstr("(4)"), HasSubstr("(3)"))));
}

TEST_F(FourControls, AnEnvelopeOfZeroTouchesNothing) {
    rig.setModelRoot(folder.path() / "missing");
    ASSERT_FALSE(rig.plug("envelope").setFloat(0.0F).error());
    EXPECT_EQ(rig.deform(0), HStatus::kSuccess);
    EXPECT_EQ(firstDifference(rig.result(0), warpRig::pointsOf(quad)), 4U);
    EXPECT_TRUE(rig.state(0)->modelPathDirty && rig.state(0)->indexMapDirty);
}

/// What makes evaluations leave the controls unread.
struct UnreadControls {
    const char* name;
    std::function<void(ModelSpec&)> spoil; ///< the model; none: export mode does
};

TEST_F(Evaluation, ControlsThatWereNotReadCountAtTheirNextChange) {
    ModelSpec good;
    good.weights = {0, 0, 1, 0, 0, 1, 0, 0, 1, 0, 0, 1};
    good.bias.assign(12, 0.0F);
    good.deltaMode = 0;
    good.fullCount = good.affectCount = 4;
    const HObject quad = warpRig::mesh(makeGrid(1, 1));
    for (const UnreadControls& row :
         {UnreadControls{"export mode", nullptr},
          UnreadControls{"a model of another mesh", [](ModelSpec& spec) { spec.fullCount = 5; }},
          UnreadControls{"a model that drives nothing", [](ModelSpec& spec) { spec.subsetState = "empty"; }}}) {
        SCOPED_TRACE(row.name);
        session.newScene();
        warpRig::Rig rig;
        rig.setModelRoot(folder.path());
        rig.addGeometry(0, {.mesh = quad});
        rig.plug("export[0].smoothingIterations").setInt(0);
        HPlug control = warpRig::plug(testNodes::create("testCase", "control"), "in");
        const HPlug passedOn = warpRig::plug(testNodes::create("testCase", "passedOn"), "out");
        warpRig::connect(warpRig::plug(control.node(), "out"), warpRig::plug(passedOn.node(), "in"));
        warpRig::connect(passedOn, rig.plug("controlValues[0]"));
        const auto movedBy = [&](double value) {
            control.setDouble(value);
            return rig.result(0)[3].z - warpRig::pointsOf(quad)[3].z;
        };
        const auto change = [&](const ModelSpec& model, const char* exportMode) {
            writeModel(modelDirectory(), model);
            script(row.spoil ? "neuralWarp -reloadModel warp1"
                             : std::string("neuralWarp -exportActive ") + exportMode + " warp1");
        };
        writeModel(modelDirectory(), good);
        EXPECT_NEAR(movedBy(0.0625), 0.0625, 1e-6);
        ModelSpec spoilt = good;
        if (row.spoil)
            row.spoil(spoilt);
        change(spoilt, "on");
        OpenQuarn::makeDirty(rig.output(0)); // commands leave that to their user
        for (const double value : {0.125, 0.25, 0.375})
            EXPECT_NEAR(movedBy(value), 0.0, 1e-6);
        takeMessages();
        change(good, "off");
        movedBy(0.4375); // after one that drove nothing, a model is loaded and not yet applied
        for (const double value : {0.5, 0.625, 0.75})
            EXPECT_NEAR(movedBy(value), value, 1e-6);
    }
}

} // namespace
