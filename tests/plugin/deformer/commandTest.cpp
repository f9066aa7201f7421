// SPDX-License-Identifier: Apache-2.0
// The command: what each combination of flags answers, shows and changes.
#include "openquarn/HCommandResult.h"
#include "openquarn/HGlobal.h"
#include "openquarn_app/Commands.h"
#include "plugin/deformer/support/WarpTest.h"
#include "plugin/deformer/support/stateText.h"

#include <functional>

namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using Numbers = std::vector<double>;
using Texts = std::vector<std::string>;

std::string noData(unsigned index) {
    return "error: [NEURAL WARP] Could not get neural warp data for index " + std::to_string(index);
}
std::string noDeltas(unsigned index) {
    return "error: [NEURAL WARP] Failed to calculate deltas for index " + std::to_string(index) +
           ". Check your node setup.";
}
std::string notANode(const std::string& name) {
    return "error: [NEURAL WARP] " + name + " is not a valid neural warp node";
}
std::string badCode(const std::string& code) {
    return "error: [NEURAL WARP] Invalid delta type \"" + code + "\" specified";
}
const std::string noTarget = "error: [NEURAL WARP] No target geometry has been specified";

Texts withoutReports(Texts messages) {
    std::erase_if(messages, [](const std::string& text) { return text.starts_with("report: "); });
    return messages;
}

HPointArray moved(const HObject& mesh, const HVector& by) {
    HPointArray points = warpRig::pointsOf(mesh);
    for (HPoint& point : points)
        point = point + by;
    return points;
}

/// What a plug-in that runs the command gets from the host.
struct Answer {
    HStatus::Code status;
    HCommandResult::Type type;
    std::string text;
    Numbers numbers;
};

Answer run(const std::string& command) {
    HCommandResult result;
    const HStatus status = HGlobal::executeCommand(command, result, false, false);
    HString text;
    HDoubleArray numbers;
    if (result.resultType() == HCommandResult::kString)
        result.getResult(text);
    else if (result.resultType() == HCommandResult::kDoubleArray)
        result.getResult(numbers);
    return {status.statusCode(), result.resultType(), text.asStdString(), Numbers(numbers.begin(), numbers.end())};
}

Numbers joined(Numbers a, const Numbers& b) {
    a.insert(a.end(), b.begin(), b.end());
    return a;
}

constexpr auto success = HStatus::kSuccess;
constexpr auto failure = HStatus::kFailure;
constexpr auto invalid = HStatus::kInvalidParameter;

struct Row {
    std::string arguments;
    HStatus::Code status;
    std::string text; ///< result; no text and no numbers: none
    Numbers numbers;
    Texts messages;
    std::string flags = "---- none ----"; ///< afterwards
    std::string fault = {};               ///< host call that fails once
};

/// "warp1" deforms triangles 0 and 4, each with a target of its own; 2 exists as well and was never evaluated.
class Command : public WarpTest {
protected:
    Command() {
        ModelSpec spec;
        spec.bias = {0, 0, 1, 0, 0, 1, 0, 0, 1};
        spec.deltaMode = 0;
        spec.fullCount = spec.affectCount = 3;
        writeModel(modelDirectory(), spec);
        rig.setModelRoot(folder.path());
        rig.setControls({0});
        for (const unsigned index : {0U, 2U, 4U}) {
            rig.addGeometry(index, {.mesh = triangle});
            rig.setTarget(index, warpRig::withPoints(triangle, moved(triangle, targetOffset(index))));
            warpRig::connect(rig.output(index),
                             warpRig::plug(warpRig::meshNode("shape" + std::to_string(index), triangle), "inMesh"));
        }
        for (const unsigned index : {0U, 4U})
            EXPECT_EQ(rig.deform(index), HStatus::kSuccess);
    }

    static HVector targetOffset(unsigned index) { return HVector(1, index, 0.5); }
    static Numbers offsets(unsigned index) {
        const auto y = static_cast<double>(index);
        return {1, y, 0.5, 1, y, 0.5, 1, y, 0.5};
    }
    std::string described(unsigned index) const {
        return std::to_string(index) + " : {'rootPath' : '" + folder.path().string() + "' ,'modelPath' : '" +
               modelDirectory().string() + "'}";
    }
    /// The flags of a geometry that the command can change, one letter each: what is due, and the export mode.
    std::string flags(unsigned index) const {
        const neuralWarp::neuralWarpData* state = rig.state(index);
        if (!state)
            return "none";
        std::string text;
        text += state->modelPathDirty ? 'p' : '-';
        text += state->metadataDirty ? 'm' : '-';
        text += state->modelLoadPending ? 'l' : '-';
        text += state->exportMode ? 'x' : '-';
        return text;
    }
    std::string flags() const { return flags(0) + ' ' + flags(2) + ' ' + flags(4); }
    void settle() {
        run("neuralWarp -exportActive off warp1");
        for (const unsigned index : {0U, 4U})
            rig.deform(index);
        takeMessages();
        EXPECT_EQ(flags(), "---- none ----");
    }
    void check(const std::vector<Row>& rows) {
        for (const Row& row : rows) {
            SCOPED_TRACE(row.fault + " neuralWarp " + row.arguments);
            if (!row.fault.empty())
                OpenQuarn::Faults::fail(row.fault);
            const Answer answer = run("neuralWarp " + row.arguments);
            EXPECT_TRUE(row.fault.empty() || OpenQuarn::Faults::fired(row.fault));
            OpenQuarn::Faults::clear();
            EXPECT_EQ(answer.status, row.status);
            EXPECT_EQ(answer.text, row.text);
            EXPECT_EQ(answer.numbers, row.numbers);
            EXPECT_EQ(answer.type == HCommandResult::kInvalid, row.text.empty() && row.numbers.empty());
            EXPECT_EQ(takeMessages(), row.messages);
            EXPECT_EQ(flags(), row.flags);
            settle();
        }
    }
    void disconnectTarget(unsigned index) const {
        const HPlug target = rig.plug("targetGeometry[" + std::to_string(index) + "]");
        warpRig::disconnect(target.source(), target);
    }

    const HObject triangle =
        warpRig::mesh({.name = "triangle", .polygons = {{0, 1, 2}}, .points = {{0, 0, 0}, {2, 0, 0}, {0, 1, 0}}});
    warpRig::Rig rig;
};

TEST_F(Command, AnswersByItsFlags) {
    rig.plug("export[0].smoothingIterations").setInt(0);
    rig.plug("export[4].smoothingIterations").setInt(0);
    check({
        {"warp1", success, "", {}, {}},
        {"-dumpInfo warp1", success, "{" + described(0) + ", " + described(4) + "}", {}, {}},
        {"warp1 -dui -multiIndex 4", success, "{" + described(4) + "}", {}, {}},
        {"-dui -mi 4 -mi 0 -mi 4 warp1",
         success,
         "{" + described(4) + ", " + described(0) + ", " + described(4) + "}",
         {},
         {}},
        {"-dui -mi 2 warp1", success, "{}", {}, {}}, // nothing is known of it yet: left out in silence
        {"-dui -mi 2147483648 warp1", failure, "", {}, {noData(2147483648)}},
        {"-rm -mi 4 -mi 4294967295 warp1", failure, "", {}, {noData(4294967295)}},
        {"-mi 0 -mi 7 -mi 9 -dumpInfo -rm -exp on -vd POS warp1", failure, "", {}, {noData(7)}},

        {"-reloadModel warp1", success, "", {}, {noData(2)}, "pml- none pml-"},
        {"-rm -mi 4 warp1", success, "", {}, {}, "---- none pml-"},
        {"-rm -mi 2 -mi 0 warp1", success, "", {}, {noData(2)}, "pml- none ----"},
        {"-rm -mi 0 -mi 2 warp1", failure, "", {}, {noData(2)}, "pml- none ----"},
        {"-rm -vertexDeltas POS -mi 0 warp1", success, "", {}, {}, "pml- none ----"}, // not even looked at
        {"-rm -dumpInfo -mi 0 warp1", success, "{" + described(0) + "}", {}, {}, "pml- none ----"},

        {"-exportActive on -mi 0 warp1", success, "", {}, {}, "---x none ----"},
        {"-exp yes -mi 2 -mi 4 warp1", success, "", {}, {}, "---- none ---x"},
        {"-exp 1 -mi 4 -mi 2 warp1", invalid, "", {}, {}, "---- none ---x"},
        {"-exp false warp1", success, "", {}, {}},
        {"-exp on -mi 0 -rm -dumpInfo warp1", success, "{" + described(0) + "}", {}, {}, "pmlx none ----"},

        {"-vertexDeltas dbp -mi 0 warp1", success, "", offsets(0), {}},
        {"-vd dbp -mi 4 -mi 0 warp1", success, "", joined(offsets(4), offsets(0)), {}},
        {"-vd dbp warp1", success, "", joined(offsets(0), offsets(4)), {noData(2)}},
        {"-vd dbp -mi 2 -mi 4 warp1", success, "", offsets(4), {noData(2)}},
        {"-vd dbp -mi 4 -mi 2 warp1", invalid, "", {}, {noData(2)}},
        {"-vd dbp -dumpInfo -mi 4 warp1", success, "", offsets(4), {}}, // the array takes the place of the text
        {"-vd dbp -exp on -mi 4 warp1", success, "", offsets(4), {}, "---- none ---x"},
        {"-vd DBS warp1", failure, "", {}, {badCode("DBS")}},
        {"-vd 'a \"b' -exp on -mi 0 warp1", failure, "", {}, {badCode("a \"b")}, "---x none ----"},
    });
}

TEST_F(Command, IsRefusedByItsSyntax) {
    const std::vector<std::pair<std::string, std::string>> rows = {
        {"", "argument 1"},
        {"warp1 warp2", "warp2"},
        {"-query warp1", "-query"},
        {"-edit -rm warp1", "-edit"},
        {"-mi -1 warp1", "-1"},
        {"-exp maybe warp1", "maybe"},
        {"-exp on -exp off warp1", "exportActive"},
    };
    for (const auto& [arguments, wanted] : rows) {
        const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand("neuralWarp " + arguments);
        EXPECT_FALSE(outcome.ok) << arguments;
        EXPECT_THAT(outcome.error, HasSubstr("neuralWarp: ")) << arguments;
        EXPECT_THAT(outcome.error, HasSubstr(wanted)) << arguments;
        EXPECT_TRUE(std::holds_alternative<std::monostate>(outcome.result)) << arguments;
        EXPECT_EQ(flags(), "---- none ----") << arguments;
    }
}

TEST_F(Command, NamesWhatIsNoDeformer) {
    testNodes::create("testSum", "sum1"); // has an object of a plug-in behind it, of another type
    check({
        {"-dumpInfo -rm nothing", failure, "", {}, {notANode("nothing")}},
        {"-dumpInfo -mi 7 time1", failure, "", {}, {notANode("time1")}},
        {"-vd POS sum1", failure, "", {}, {notANode("sum1")}},
        {"'two words'", failure, "", {}, {notANode("two words")}},
    });
}

TEST_F(Command, DoesNothingForANodeWithoutGeometry) {
    const warpRig::Rig bare("bare");
    check({
        {"bare", success, "", {}, {}},
        {"-dumpInfo bare", success, "{}", {}, {}},
        {"-rm -exp on bare", success, "", {}, {}},
        {"-vd pos bare", success, "", {}, {}},
        {"-vd nil bare", failure, "", {}, {badCode("nil")}},
        {"-mi 0 bare", failure, "", {}, {noData(0)}},
    });
}

TEST_F(Command, ActsOnHostCallsThatFail) {
    const std::string untouched = "---- none ----";
    check({
        {"-rm warp1", failure, "", {}, {}, untouched, "HArgDatabase::HArgDatabase"},
        {"-rm warp1", failure, "", {}, {notANode("warp1")}, untouched, "HArgDatabase::getCommandArgument"},
        {"-rm -mi 0 warp1", success, "", {}, {}, "pml- none ----", "HSelectionList::add"},
        {"-rm warp1", failure, "", {}, {notANode("warp1")}, untouched, "HSelectionList::getDependNode"},
        {"-dumpInfo -rm warp1", success, "{}", {}, {}, untouched, "HFnDependencyNode::findPlug"},
        {"-rm -mi 0 -mi 4 warp1", success, "", {}, {}, "---- none pml-", "HArgParser::getFlagArgumentList"},
        {"-exp on -mi 0 warp1", failure, "", {}, {}, untouched, "HArgParser::getFlagArgument"},
        {"-exp on -rm -mi 0 warp1", success, "", {}, {}, "pml- none ----", "HArgParser::getFlagArgument"},
        {"-vd dbp -mi 0 warp1", failure, "", {}, {}, untouched, "HArgParser::getFlagArgument"},
    });
}

TEST_F(Command, DeltasThatCannotBeMeasuredNameTheirGeometry) {
    disconnectTarget(0);
    const Answer first = run("neuralWarp -vd dbp -mi 0 -mi 4 warp1");
    EXPECT_EQ(first.status, HStatus::kSuccess);
    EXPECT_EQ(first.numbers, offsets(4)); // of the second alone
    EXPECT_THAT(withoutReports(takeMessages()), ElementsAre(noTarget, noDeltas(0)));

    const Answer last = run("neuralWarp -vd dbp -mi 4 -mi 0 warp1");
    EXPECT_EQ(last.status, HStatus::kFailure);
    EXPECT_EQ(last.type, HCommandResult::kInvalid);
    EXPECT_THAT(withoutReports(takeMessages()), ElementsAre(noTarget, noDeltas(0)));

    // a target of fewer vertices has no deltas, which is no failure
    rig.setTarget(0, warpRig::mesh({.name = "one", .polygons = {}, .points = {{0, 0, 0}}}));
    const Answer none = run("neuralWarp -vd dbp -mi 0 warp1");
    EXPECT_EQ(none.status, HStatus::kSuccess);
    EXPECT_EQ(none.type, HCommandResult::kDoubleArray);
    EXPECT_THAT(none.numbers, IsEmpty());
    EXPECT_EQ(run("neuralWarp -vd dbp -mi 0 -mi 4 warp1").numbers, offsets(4));
}

/// As a host that is in the middle of an edit may leave things: the state is of more vertices than the meshes have.
TEST_F(Command, DeltasAreNotReadBeyondWhatThereIs) {
    using State = neuralWarp::neuralWarpData;
    const auto fourVertices = [](State& state) { state.componentMap.setIdentity(4); };
    const auto smallRest = [this](State& state) {
        rig.setRest(0, warpRig::mesh({.name = "edge", .polygons = {}, .points = {{0, 0, 0}, {2, 0, 0}}}));
        stateText::raise(state, "applied valid");
    };
    const struct {
        const char* code;
        std::function<void(State&)> spoil;
        const char* text;
    } rows[] = {{"dbp", fourVertices, "the input geometry has 0 points for 4 points of the target"},
                {"pos", fourVertices, "the rest geometry has 0 points for 4 points of the target"},
                {"dbs", smallRest, "the rest geometry has 0 points for 3 points of the target"}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.code);
        rig.setRest(0, triangle);
        rig.setTarget(0, warpRig::mesh(makeGrid(1, 1)));
        ASSERT_EQ(rig.deform(0), HStatus::kSuccess);
        row.spoil(*rig.state(0));
        EXPECT_EQ(run(std::string("neuralWarp -mi 0 -vd ") + row.code + " warp1").status, failure);
        EXPECT_THAT(takeMessages(), Contains(HasSubstr(row.text)));
        rig.state(0)->markAllDirty();
    }
}

TEST_F(Command, ExportModeNeedsTheElementOfTheExportAttributes) {
    EXPECT_EQ(run("neuralWarp -exp off -mi 4 warp1").status, HStatus::kSuccess);
    EXPECT_NE(run("neuralWarp -exp on -mi 4 warp1").status, HStatus::kSuccess);
    EXPECT_THAT(takeMessages(), ElementsAre(HasSubstr("neuralWarp/neuralWarpNode")));
    EXPECT_EQ(flags(4), "----");
}

} // namespace
