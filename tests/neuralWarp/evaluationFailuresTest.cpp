// SPDX-License-Identifier: Apache-2.0
// Everything that can go wrong in an evaluation: what is said, what it answers, and that the geometry is then either as
// it came, to the last bit, or as it should be.
#include "neuralWarp/support/FailureTest.h"

#include "openquarn/HDGModifier.h"

#include <functional>
#include <limits>

namespace {

using OpenQuarn::Faults;
using testing::ElementsAre;
using testing::IsEmpty;

class EvaluationFailures : public FailureTest {
public:
    enum class Points { asTheyCame, rounded, moved };

    /// A rig with its model loaded; `change` is applied to the specification of the model.
    warpRig::Rig& makeRig(const std::function<void(ModelSpec&)>& change = {}) {
        session.newScene();
        ModelSpec spec = modelSpec();
        if (change)
            change(spec);
        writeModel(modelDirectory(), spec);
        rig_.emplace();
        rig_->addGeometry(0, {.mesh = unevenMesh()});
        rig_->setModelRoot(folder.path());
        rig_->setControls({1.0});
        return *rig_;
    }
    void remove(const char* element) const {
        HDGModifier modifier;
        modifier.removeMultiInstance(rig_->plug(element), true);
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

    std::optional<warpRig::Rig> rig_;
};

std::string onDemand(const char* operation) {
    return std::string(operation) + ": failed on demand";
}

TEST_F(EvaluationFailures, AreSaidAndLeaveTheGeometryAsItCame) {
    using T = EvaluationFailures;
    const std::string restInvalid = "error: [NEURAL WARP] Original geometry is not a valid mesh";
    const std::string targetInvalid = "error: [NEURAL WARP] Target geometry is not a valid mesh";
    const std::string noDeltas = "error: [NEURAL WARP] No delta computed from the ML model";
    const auto fault = [](const char* operation, int call = 1) {
        return [=](T&) { Faults::fail(operation, call); };
    };
    const auto controls = [](std::vector<double> values) { return [=](T& t) { t.rig_->setControls(values); }; };
    const auto morph = [](HObject mesh) {
        return [=](T& t) {
            t.rig_->plug("targetMorphEnabled").setBool(true);
            if (!mesh.isNull())
                t.rig_->setMorphTarget(0, mesh);
        };
    };
    const auto reload = [](std::function<void(ModelSpec&)> change) {
        return [=](T& t) {
            ModelSpec spec = modelSpec();
            change(spec);
            writeModel(t.modelDirectory(), spec);
            nodeOf(*t.rig_).requestReload(0);
        };
    };
    const auto tooFew = [](const char* has, const char* needed) {
        return Texts{"error: [NEURAL WARP] Size of predicted deltas (" + std::string(has) +
                         ") does not match affected vertex count (" + needed + ")",
                     report("the model gives " + std::string(has) + " deltas where " + needed + " are needed")};
    };
    struct Row {
        const char* name;
        std::function<void(T&)> spoil; ///< after a first evaluation that went well
        Texts messages;
        bool wasApplied = false; ///< what modelApplied says then
    };
    const Row rows[] = {
        {"no element of models", [](T& t) { t.remove("models[0]"); }, {}, true},
        {"envelope", fault("HDataBlock::inputValue"), {report(onDemand("HDataBlock::inputValue"))}, true},
        {"no state", fault("HArrayDataHandle::outputValue"), {}, true},
        {"rest without a mesh", [](T& t) { t.rig_->setRest(0, {}); }, {restInvalid}, true},
        {"rest too small", [](T& t) { t.rig_->setRest(0, unevenMesh(2, 1)); }, {restInvalid}, true},
        {"no rest", [](T& t) { t.remove("originalGeometry[0]"); },
         {report("'warp1.originalGeometry' has no element 0")}, true},
        {"morph without an element", morph({}),
         {targetInvalid, report("'warp1.targetMorphGeometry' has no element 0")}, true},
        {"morph without a mesh",
         [&](T& t) {
             morph(unevenMesh())(t);
             const HStatus status = t.rig_->plug("targetMorphGeometry[0]").source().node().isNull()
                                        ? HStatus::kFailure
                                        : HStatus::kSuccess;
             ASSERT_EQ(status, HStatus::kSuccess);
             warpRig::setMesh(t.rig_->plug("targetMorphGeometry[0]").source().node(), {});
         },
         {targetInvalid, report("failure")}, true},
        {"morph too small", morph(unevenMesh(2, 1)),
         {"error: [NEURAL WARP] Size of target geometry (0) does not match deforming geometry (9)", report("failure")},
         true},
        {"no controls", controls({}),
         {"error: [NEURAL WARP] Size of the ML model inputs (1) does not match the connected control attributes "
          "count(0).",
          report("failure"), report("failure")},
         true},
        {"control values", fault("HDataBlock::inputArrayValue"),
         {report(onDemand("HDataBlock::inputArrayValue"), "neuralWarp/neuralWarpUtils"),
          report(onDemand("HDataBlock::inputArrayValue")), report(onDemand("HDataBlock::inputArrayValue"))},
         true},
        {"no number", controls({std::numeric_limits<double>::quiet_NaN()}), {}, true},
        {"infinite as a float", controls({1e300}), {}, true},
        {"too few outputs", reload([](ModelSpec& spec) { spec.bias.resize(26); }), tooFew("8", "9"), true},
        {"no whole delta", reload([](ModelSpec& spec) { spec.bias.resize(2); }), tooFew("0", "9"), true},
        {"too few coefficients",
         reload([](ModelSpec& spec) {
             spec.bias.resize(1);
             spec.shapes = {std::vector<float>(27), std::vector<float>(27)};
         }),
         {noDeltas, report("the model gives 1 coefficients for 2 principal shapes")}, true},
        {"too small a basis", reload([](ModelSpec& spec) { spec.shapes = {std::vector<float>(24, 1.0F)}; }),
         tooFew("8", "9"), true},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        makeRig();
        ASSERT_EQ(rig_->deform(0), HStatus::kSuccess);
        const Coordinates moved = result(*rig_);
        row.spoil(*this);
        const HPlug output = rig_->output(0);
        OpenQuarn::makeDirty(output);
        EXPECT_NE(OpenQuarn::evaluate(output), HStatus::kSuccess);
        Faults::clear();
        Texts messages = said();
        if (row.messages.empty() && messages.size() == 2) { // the network's own words follow
            EXPECT_EQ(messages[0], noDeltas);
            EXPECT_THAT(messages[1], testing::StartsWith(report("the model gave no values: ")));
        } else {
            EXPECT_EQ(messages, row.messages);
        }
        EXPECT_EQ(result(*rig_), came());
        EXPECT_EQ(rig_->state(0)->modelApplied, row.wasApplied);
    }
}

} // namespace
