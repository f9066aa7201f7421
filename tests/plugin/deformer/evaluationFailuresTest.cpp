// SPDX-License-Identifier: Apache-2.0
// Everything that can go wrong in an evaluation: what is said, what it answers, and that the geometry is then either as
// it came, to the last bit, or as it should be.
#include "plugin/deformer/support/FailureTest.h"

#include "host/support/testNodes.h"
#include "openquarn/HDGModifier.h"
#include "openquarn_app/Interrupt.h"

#include <functional>
#include <limits>

namespace {

using OpenQuarn::Faults;
using testing::IsEmpty;

class EvaluationFailures : public FailureTest {
public:
    void remove(const char* element) const {
        HDGModifier modifier;
        modifier.removeMultiInstance(rig->plug(element), true);
        EXPECT_EQ(modifier.doIt(), HStatus::kSuccess);
    }

    /// Messages of the deformer: the host adds one of its own to each failing evaluation.
    Texts said() {
        Texts texts = shown();
        texts.erase(std::remove_if(texts.begin(), texts.end(),
                                   [](const std::string& text) {
                                       return text.rfind("report: 'warp1.outputGeom[0]' could not be computed", 0) == 0;
                                   }),
                    texts.end());
        return texts;
    }
};

std::string onDemand(const std::string& operation) {
    return operation + ": failed on demand";
}

TEST_F(EvaluationFailures, AreSaidAndLeaveTheGeometryAsItCame) {
    using T = EvaluationFailures;
    const std::string restInvalid = "error: [NEURAL WARP] Original geometry is not a valid mesh";
    const std::string targetInvalid = "error: [NEURAL WARP] Target geometry is not a valid mesh";
    const std::string noDeltas = "error: [NEURAL WARP] No delta computed from the ML model";
    const Texts notFinite{noDeltas, report("the model gave no values: a control value is not finite")};
    const auto fault = [](const char* operation) { return [=](T&) { Faults::fail(operation); }; };
    const auto controls = [](const std::vector<double>& values) { return [=](T& t) { t.rig->setControls(values); }; };
    const auto removed = [](const char* element) { return [=](T& t) { t.remove(element); }; };
    const auto rest = [](HObject mesh) { return [=](T& t) { t.rig->setRest(0, mesh); }; };
    const auto morphOn = [](T& t) { t.rig->plug("targetMorphEnabled").setBool(true); };
    const auto smallMorph = [&](T& t) {
        morphOn(t);
        t.rig->setMorphTarget(0, unevenMesh(2, 1));
    };
    const auto noMorphMesh = [&](T& t) {
        smallMorph(t);
        warpRig::setMesh(t.rig->plug("targetMorphGeometry[0]").source().node(), {});
    };
    const auto model = [](std::size_t outputs, std::size_t shapes = 0, std::size_t shapeSize = 27) {
        return [=](T& t) {
            t.writeChanged([&](ModelSpec& spec) {
                spec.bias.resize(outputs);
                spec.shapes.assign(shapes, std::vector<float>(shapeSize, 1.0F));
            });
            nodeOf(*t.rig).requestReload(0);
        };
    };
    const auto tooFew = [](const std::string& has) {
        return Texts{"error: [NEURAL WARP] Size of predicted deltas (" + has +
                         ") does not match affected vertex count (9)",
                     report("the model gives " + has + " deltas where 9 are needed")};
    };
    const auto noElement = [](const char* array) {
        return report(std::string("'warp1.") + array + "' has no element 0");
    };
    const std::string targetMismatch =
        "error: [NEURAL WARP] Size of target geometry (0) does not match deforming geometry (9)";
    const std::string controlMismatch = "error: [NEURAL WARP] Size of the ML model inputs (1) does not match the "
                                        "connected control attributes count(0).";
    const std::string fewControls = report("the model has more inputs than there are control values");
    const std::string noArray = "HDataBlock::inputArrayValue";
    const std::string noArrayReport = report(onDemand(noArray));
    struct Row {
        const char* name;
        std::function<void(T&)> spoil; ///< after a first evaluation that went well
        Texts messages;
    };
    const Row rows[] = {
        {"no element of models", removed("models[0]"), {}},
        {"rest without a mesh", rest({}), {restInvalid}},
        {"rest too small", rest(unevenMesh(2, 1)), {restInvalid}},
        {"no rest", removed("originalGeometry[0]"), {noElement("originalGeometry")}},
        {"morph without an element", morphOn, {targetInvalid, noElement("targetMorphGeometry")}},
        {"morph without a mesh", noMorphMesh, {targetInvalid, report("the target of the morph is no mesh")}},
        {"morph too small",
         smallMorph,
         {targetMismatch, report("the target of the morph has fewer vertices than the geometry")}},
        {"no controls", controls({}), {controlMismatch, fewControls, fewControls}},
        {"control values",
         fault("HDataBlock::inputArrayValue"),
         {report(onDemand(noArray), "neuralWarp/neuralWarpUtils"), noArrayReport, noArrayReport}},
        {"no number", controls({std::numeric_limits<double>::quiet_NaN()}), notFinite},
        {"infinite as a float", controls({1e300}), notFinite},
        {"too few outputs", model(26), tooFew("8")},
        {"no whole delta", model(2), tooFew("0")},
        {"too few coefficients",
         model(1, 2),
         {noDeltas, report("the model gives 1 coefficients for 2 principal shapes")}},
        {"too small a basis", model(1, 1, 24), tooFew("8")},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        writeModel(modelDirectory(), modelSpec());
        makeRig();
        ASSERT_EQ(rig->deform(0), HStatus::kSuccess);
        row.spoil(*this);
        const HPlug output = rig->output(0);
        OpenQuarn::makeDirty(output);
        EXPECT_NE(OpenQuarn::evaluate(output), HStatus::kSuccess);
        Faults::clear();
        EXPECT_EQ(said(), row.messages);
        EXPECT_EQ(result(*rig), came());
    }
}

TEST_F(EvaluationFailures, OfANetworkBesideTheFrameAreSaidOnce) {
    const HObject mesh = unevenMesh(30, 30);
    writeModel(modelDirectory(), modelSpec(31 * 31));
    makeRig(mesh);
    ASSERT_EQ(rig->deform(0), HStatus::kSuccess);
    const Coordinates right = result(*rig);
    for (int frame = 0; frame < 20; ++frame) {
        rig->setControls({std::numeric_limits<double>::quiet_NaN()});
        EXPECT_EQ(rig->deform(0), HStatus::kFailure);
        EXPECT_EQ(said(), (Texts{"error: [NEURAL WARP] No delta computed from the ML model",
                                 report("the model gave no values: a control value is not finite")}));
        EXPECT_EQ(result(*rig), coordinates(warpRig::pointsOf(mesh)));
        rig->setControls({1.0});
        EXPECT_EQ(rig->deform(0), HStatus::kSuccess);
        EXPECT_EQ(result(*rig), right);
    }
}

TEST_F(EvaluationFailures, LongWorkEndsWhenTheUserAsksForIt) {
    writeChanged([](ModelSpec& spec) { spec.smoothingIterations = 4000000000U; });
    makeRig();
    OpenQuarn::setInterrupted(true);
    EXPECT_EQ(rig->deform(0), HStatus::kFailure);
    EXPECT_THAT(said().front(), "warning: 'warp1' smooths geometry 0 in 4000000000 passes, as its model says, in each "
                                "frame: up to 12252 s");
    EXPECT_EQ(result(*rig), came());
    EXPECT_THAT(stateText::raised(*rig->state(0)), testing::HasSubstr("restFrames"));
    OpenQuarn::setInterrupted(false);
    writeModel(modelDirectory(), modelSpec());
    nodeOf(*rig).requestReload(0);
    EXPECT_EQ(rig->deform(0), HStatus::kSuccess);
    EXPECT_EQ(stateText::raised(*rig->state(0)), "applied valid");
}

// --- every call of the host that an evaluation makes ---

class EveryHostCall : public EvaluationFailures {
public:
    /// Everything that an evaluation can do: frames, smoothing, shapes, an affect map, weights and a morph.
    void makeFullRig(bool isMorphed, bool isOn = true) {
        session.newScene();
        rig.emplace();
        rig->addGeometry(0, {.mesh = unevenMesh(),
                             .affected = std::vector<unsigned>{7, 1, 4, 0, 3},
                             .weights = {0.25F, 0.5F, 0.75F, 1.0F, 0.9F, 0.8F, 0.7F, 0.6F, 0.5F},
                             .modelOn = isOn});
        rig->setModelRoot(folder.path());
        rig->setControls({0.5, -1.0, 2.0});
        HPointArray points = warpRig::pointsOf(unevenMesh());
        for (HPoint& p : points)
            p = {p.y, p.z, p.x};
        rig->setMorphTarget(0, warpRig::withPoints(unevenMesh(), points));
        rig->plug("targetMorphEnabled").setBool(isMorphed);
        rig->plug("targetMorphEnvelope").setDouble(0.5);
        for (const char* into : {"input[0].inputGeometry", "originalGeometry[0]", "targetMorphGeometry[0]"})
            OpenQuarn::evaluate(rig->plug(into).source()); // calls of other nodes are not looked at
    }
    void writeFullModel() const {
        writeChanged([](ModelSpec& spec) {
            spec.controls = 2;
            spec.affectCount = 5;
            spec.smoothingIterations = 2;
            spec.subsetState = "partial";
            spec.affectMap = {0, 1, 2, 3, 4};
            spec.shapes = {spec.bias, spec.bias};
            spec.shapes[1][4] = 9.0F;
            spec.bias = {0.25F, 0.5F};
        });
    }
    Coordinates evaluated() {
        EXPECT_EQ(rig->deform(0), HStatus::kSuccess);
        takeMessages();
        return result(*rig);
    }
    /// One evaluation in which one call fails. False when there is no such call.
    bool expectCall(const std::string& operation, int call, bool isFirst);

    Coordinates right, withoutModel;
};

bool EveryHostCall::expectCall(const std::string& operation, int call, bool isFirst) {
    const HPlug output = rig->output(0);
    if (!isFirst) {
        EXPECT_EQ(evaluated(), right);
        nodeOf(*rig).requestReload(0);
    }
    OpenQuarn::makeDirty(output);
    Faults::fail(operation, call);
    const HStatus status = OpenQuarn::evaluate(output);
    const bool isReached = Faults::fired(operation);
    Faults::clear();
    const Texts messages = takeMessages();
    if (!isReached)
        return false;

    const Coordinates points = result(*rig);
    neuralWarp::neuralWarpData* state = rig->state(0);
    const bool isApplied = state && state->modelApplied;
    // a polygon that the host does not give is left out
    const bool dropsPolygon = operation == "HFnMesh::getPolygonVertices" || operation == "HArray::assign";
    if (status.error() || !isApplied) {
        EXPECT_THAT(messages, testing::Not(IsEmpty()));
        EXPECT_TRUE(points == came() || (!status.error() && points == withoutModel));
    } else if (!dropsPolygon) {
        EXPECT_EQ(points, right);
    }
    if (state && dropsPolygon)
        state->markAllDirty();
    else if (!status.error() && !isApplied) // it is the loader that failed, and it is not tried again
        nodeOf(*rig).requestReload(0);
    EXPECT_EQ(evaluated(), right);
    return true;
}

// Attributes are looked up once in a process: it takes one of its own to see this fail.
TEST_F(EveryHostCall, AnAttributeThatWasNotFoundIsLookedUpAgain) {
    writeFullModel();
    makeFullRig(false);
    const HPlug output = rig->output(0);
    for (int attempt = 0; attempt < 3; ++attempt) {
        OpenQuarn::makeDirty(output);
        Faults::fail("HNodeClass::attribute");
        const HStatus status = OpenQuarn::evaluate(output);
        EXPECT_EQ(status.error(), Faults::fired("HNodeClass::attribute"));
        Faults::clear();
        if (status.error()) {
            EXPECT_EQ(result(*rig), came());
        }
        takeMessages();
        rig->state(0)->markAllDirty();
        EXPECT_NE(evaluated(), came());
    }
}

TEST_F(EveryHostCall, MayFailWithoutHarm) {
    writeFullModel();
    std::vector<std::string> reached;
    for (const bool isMorphed : {false, true}) {
        makeFullRig(isMorphed, false);
        withoutModel = evaluated();
        makeFullRig(isMorphed);
        right = evaluated();
        ASSERT_TRUE(rig->state(0)->modelApplied);
        ASSERT_NE(right, withoutModel);
        for (const std::string& operation : Faults::operations())
            for (const bool isFirst : {true, false})
                for (int call = 1; call < 500; ++call) {
                    SCOPED_TRACE(operation + ", call " + std::to_string(call) + (isFirst ? "" : " of a reload"));
                    makeFullRig(isMorphed);
                    if (!expectCall(operation, call, isFirst))
                        break;
                    if (call == 1)
                        reached.push_back(operation);
                }
    }
    EXPECT_GE(reached.size(), 60U);
    EXPECT_THAT(reached, testing::IsSupersetOf({"HArrayDataHandle::jumpToElement", "HFnMesh::getPolygonVertices"}));
}

} // namespace
