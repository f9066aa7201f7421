// SPDX-License-Identifier: Apache-2.0
// Everything that can be wrong with a model directory: what is said, what happens to the geometry and to the flags, and
// when it is tried again.
#include "plugin/deformer/support/FailureTest.h"

#include "openquarn_app/Animation.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Usage.h"

#include <functional>

namespace {

namespace fs = std::filesystem;
using testing::IsEmpty;

const std::string otherVertices = "the model was trained on another number of vertices";
const std::string noPath = "error: [NEURAL WARP] No model path specified";
const std::string modelInit = "error: [NEURAL WARP] No ML model initialized for index 0";
const std::string modelInvalid = "error: [NEURAL WARP] The training of the ml model for index 0 does not match the "
                                 "connected geometry. It will need to be retrained.";

std::string badPath(const std::string& path) {
    return "error: [NEURAL WARP] Unable to access the ML model file at " + path;
}
std::string fullCountMismatch(unsigned trained) {
    return "error: [NEURAL WARP \"warp1\", multiIndex 0] Vertex count of the deformed geometry (9) does not match the "
           "vertex count of the trained model (" +
           std::to_string(trained) + ")";
}
std::string affectCountMismatch(unsigned trained) {
    return "warning: [NEURAL WARP \"warp1\", multiIndex 0] Affected vertex count of the deformer (9) does not match "
           "the affected vertex count of the trained model (" +
           std::to_string(trained) + ")";
}

class LoadingFailures : public FailureTest {
public:
    enum class Points { asTheyCame, rounded, moved };
    /// What one evaluation comes to.
    struct Outcome {
        Texts messages;
        Points points;
        std::string flags;
    };
    struct Row {
        const char* name;
        std::function<void(LoadingFailures&)> spoil;
        Outcome outcome;
        std::string printed = {}; ///< on standard output
    };

    // --- what follows from a failing step of loading ---

    static Outcome directoryFails(const Texts& messages) { return {messages, Points::asTheyCame, "load metadata"}; }
    static Outcome metadataFails(const Texts& messages) { return {messages, Points::asTheyCame, "load"}; }
    static Outcome validationFails(const Texts& messages) { return {messages, Points::rounded, ""}; }
    static Outcome networkFails(const Texts& messages, const char* flags = "valid") {
        return {messages, Points::rounded, flags};
    }
    static Outcome loads(const Texts& messages, const char* flags = "applied valid") {
        return {messages, Points::moved, flags};
    }

    // --- the rig ---

    void setModelName(const std::string& name) const { rig->plug("models[0].modelName").setString(name); }
    void setRoot(const std::string& path) const { rig->plug("modelRoot").setString(path); }
    fs::path file(const std::string& name) const { return modelDirectory() / name; }

    // --- ways to spoil the model ---

    using Spoil = std::function<void(LoadingFailures&)>;
    static Spoil root(const std::string& path) {
        return [=](LoadingFailures& t) { t.setRoot(path); };
    }
    static Spoil name(const std::string& text) {
        return [=](LoadingFailures& t) { t.setModelName(text); };
    }
    static Spoil gone(const std::string& name) {
        return [=](LoadingFailures& t) { fs::remove_all(t.file(name)); };
    }
    static Spoil folderAt(const std::string& name) {
        return [=](LoadingFailures& t) {
            fs::remove(t.file(name));
            fs::create_directory(t.file(name));
        };
    }
    /// A link to itself, which cannot be looked up.
    static Spoil loopAt(const std::string& name) {
        return [=](LoadingFailures& t) {
            fs::remove(t.file(name));
            fs::create_symlink(name, t.file(name));
        };
    }
    static Spoil text(const std::string& name, const std::string& bytes) {
        return [=](LoadingFailures& t) { writeFile(t.file(name), bytes); };
    }
    static Spoil written(void (*change)(ModelSpec&)) {
        return [=](const LoadingFailures& t) { t.writeChanged(change); };
    }

    /// What the evaluation prints.
    std::string deform() const {
        StdoutCapture out;
        const HStatus status = rig->deform(0);
        std::string printed = withoutFolder(out.take());
        EXPECT_EQ(status, HStatus::kSuccess);
        return printed;
    }

    void expectOutcome(const Outcome& outcome) {
        EXPECT_EQ(shown(), outcome.messages);
        EXPECT_EQ(result(*rig), outcome.points == Points::moved     ? moved
                                : outcome.points == Points::rounded ? rounded()
                                                                    : came());
        EXPECT_EQ(stateText::raised(*rig->state(0)), outcome.flags);
    }

    void expectRow(const Row& row);
    void expectRows(const std::vector<Row>& rows) {
        for (const Row& row : rows) {
            SCOPED_TRACE(row.name);
            expectRow(row);
        }
    }
    static std::string unanswered(const std::string& path,
                                  const std::string& reason = "Too many levels of symbolic links") {
        return report("'ROOT/" + path + "' cannot be looked up: " + reason);
    }

    Coordinates moved;
};

void LoadingFailures::expectRow(const Row& row) {
    writeModel(modelDirectory(), modelSpec());
    makeRig();
    if (moved.empty()) {
        ASSERT_EQ(rig->deform(0), HStatus::kSuccess);
        moved = result(*rig);
        ASSERT_NE(moved, rounded());
        makeRig();
    }
    row.spoil(*this);
    EXPECT_EQ(deform(), row.printed);
    expectOutcome(row.outcome);
    deform(); // what was left due is tried with what there is
    deform();
    takeMessages();
    const std::string settled = stateText::raised(*rig->state(0));
    EXPECT_EQ(deform(), "");
    EXPECT_THAT(shown(), IsEmpty()) << "tried again by itself";
    EXPECT_EQ(stateText::raised(*rig->state(0)), settled);
    EXPECT_TRUE(OpenQuarn::runCommand("neuralWarp -multiIndex 0 -reloadModel warp1"));
    EXPECT_EQ(deform(), row.printed);
    EXPECT_EQ(shown(), row.outcome.messages);

    fs::remove_all(modelDirectory());
    writeModel(modelDirectory(), modelSpec());
    setRoot(folder.path().string());
    setModelName("model");
    EXPECT_EQ(deform(), "");
    expectOutcome(loads({}));
}

TEST_F(LoadingFailures, OfTheDirectory) {
    const std::string longName(300, 'n');
    const auto aFile = [](const LoadingFailures& t) {
        fs::remove_all(t.modelDirectory());
        writeFile(t.modelDirectory(), "not a directory");
    };
    const auto belowAFile = [](const LoadingFailures& t) { t.setRoot(t.file("model.onnx").string()); };
    const auto loop = [](LoadingFailures& t) {
        loopAt("loop")(t);
        t.setRoot(t.file("loop").string());
    };
    expectRows({
        {"no root", root(""), directoryFails({noPath})},
        {"missing root", root("/no/such folder"), directoryFails({badPath("/no/such folder")})},
        {"no name", name(""), directoryFails({noPath})},
        {"missing directory", name("other.onnx"), directoryFails({badPath("ROOT/other.nwrp")})},
        {"a file instead", aFile, directoryFails({badPath("ROOT/model.nwrp")})},
        {"below a file", belowAFile, directoryFails({badPath("ROOT/model.nwrp/model.onnx/model.nwrp")})},
        {"loop of links", loop, directoryFails({unanswered("model.nwrp/loop")})},
        {"name too long", name(longName), directoryFails({unanswered(longName + ".nwrp", "File name too long")})},
    });
}

TEST_F(LoadingFailures, OfTheMetadata) {
    const char* file = "metadata.json";
    const std::string bad = "error: [NEURAL WARP \"warp1\"] Failed to load metadata from ROOT/model.nwrp/metadata.json";
    const auto otherFullCount = [](ModelSpec& spec) { spec.fullCount = 10; };
    const auto otherCounts = [](ModelSpec& spec) { spec.fullCount = spec.affectCount = 0; };
    const auto otherAffectCount = [](ModelSpec& spec) { spec.affectCount = 7; };
    const auto otherOrder = [](ModelSpec& spec) {
        spec.subsetState = "partial";
        spec.affectMap = {8, 7, 6, 5, 4, 3, 2, 1, 0};
        spec.componentTagExpression = "face";
        for (std::size_t i = 0; i < 4; ++i) // the slots the other way round give the same deltas
            std::swap_ranges(&spec.bias[3 * i], &spec.bias[3 * i] + 3, &spec.bias[3 * (8 - i)]);
    };
    const std::string setup = "warning: [NEURAL WARP \"warp1\", multiIndex 0] Setup for multiIndex 0 not the same as "
                              "for trained model. Using deltas on 9 of 9 affected verts. Trained model subset is "
                              "\"face\"";
    expectRows({
        {"missing", gone(file), metadataFails({})},
        {"malformed", text(file, "{"), metadataFails({bad}), "Parse error\n"},
        {"unreadable", folderAt(file), metadataFails({bad}), "Failed to open metadata file stream\n"},
        {"loop of links", loopAt(file), metadataFails({unanswered("model.nwrp/metadata.json")})},
        {"another vertex count", written(otherFullCount),
         validationFails({fullCountMismatch(10), modelInvalid, report(otherVertices)})},
        {"both counts", written(otherCounts),
         validationFails({fullCountMismatch(0), affectCountMismatch(0), modelInvalid, report(otherVertices)})},
        {"another affected count", written(otherAffectCount), loads({affectCountMismatch(7)})},
        {"another order of vertices", written(otherOrder), loads({setup}, "applied valid affectMap")},
    });
}

TEST_F(LoadingFailures, OfTheNetworkAndItsShapes) {
    const char* file = "model.onnx";
    const char* shapes = "principal_shapes.json";
    const std::string printed = "[NEURAL WARP] ERROR, Failed to load the ONNX model ROOT/model.nwrp/model.onnx\n";
    const auto refused = [](const std::string& why) {
        return networkFails({modelInit, report("'ROOT/model.nwrp/model.onnx' cannot be used: " + why)});
    };
    expectRows({
        {"missing", gone(file), networkFails({badPath("ROOT/model.nwrp/model.onnx"), modelInit})},
        {"damaged", text(file, "no network"), refused("the file is damaged, or no ONNX file"), printed},
        {"a directory", folderAt(file), refused("not a regular file"), printed},
        {"loop of links", loopAt(file), refused("Too many levels of symbolic links"), printed},
        {"bad shapes", text(shapes, "[1"), loads({}), "Parse error\n"},
        {"no object of shapes", text(shapes, "[1]"), loads({}),
         "Error: ROOT/model.nwrp/principal_shapes.json: it holds no JSON object\n"},
        {"shapes that are too short",
         text(shapes, R"({"principalShapeCount":1,"vertCount":1,"principalShapes":[[1]]})"), loads({}),
         "Error: ROOT/model.nwrp/principal_shapes.json: shape 0 has 1 numbers, and 3 are needed\n"},
        {"shapes of another count", text(shapes, R"({"principalShapeCount":2,"vertCount":1,"principalShapes":[[1]]})"),
         loads({}), "Error: principalShapeCount does not match the number of principal shapes\n"},
        {"loop instead of shapes", loopAt(shapes), networkFails({unanswered("model.nwrp/principal_shapes.json")}, "")},
    });
}

/// The directory becomes that of another model in the middle of a load, at a message of it: what comes out is the other
/// model, and nothing of both.
TEST_F(LoadingFailures, ADirectoryThatIsReplacedWhileItIsRead) {
    const auto warns = [](ModelSpec& spec) { spec.affectCount = 7; };
    const auto isOther = [](ModelSpec& spec) {
        spec.smoothingIterations = 2;
        std::reverse(spec.bias.begin(), spec.bias.end());
        spec.shapes = {spec.bias, spec.bias};
    };
    writeChanged(isOther);
    makeRig();
    ASSERT_EQ(deform(), "");
    const Coordinates other = result(*rig);
    fs::rename(modelDirectory(), folder.path() / "other");

    const auto exchanged = [&] {
        fs::rename(modelDirectory(), folder.path() / "before");
        fs::rename(folder.path() / "other", modelDirectory());
    };
    const auto writtenInto = [&] { writeChanged(isOther); };
    const auto writtenAgain = [&] { writeChanged(warns); };
    struct Case {
        const char* name;
        std::function<void()> change;
        unsigned warnings;
        bool isGivenUp;
    };
    for (const Case& c : {Case{"written into", writtenInto, 1, false},
                          {"again and again", writtenAgain, 8, true},
                          {"exchanged", exchanged, 1, false}}) {
        SCOPED_TRACE(c.name);
        writeChanged(warns);
        makeRig();
        OpenQuarn::MessageSink before;
        before = OpenQuarn::setMessageSink([&](const OpenQuarn::Message& message) {
            before(message);
            if (message.severity == OpenQuarn::Severity::warning)
                c.change();
        });
        EXPECT_EQ(deform(), "");
        OpenQuarn::setMessageSink(std::move(before));
        Texts messages(c.warnings, affectCountMismatch(7));
        if (c.isGivenUp)
            messages.insert(messages.end(), {modelInit, report("'ROOT/model.nwrp' was written again and again while it "
                                                               "was read: the next evaluation reads it")});
        EXPECT_EQ(shown(), messages);
        EXPECT_EQ(result(*rig), c.isGivenUp ? rounded() : other);
        if (!c.isGivenUp)
            continue;
        EXPECT_EQ(stateText::raised(*rig->state(0)), "load metadata path");
        writeChanged(isOther);
        EXPECT_EQ(deform(), "");
        EXPECT_EQ(result(*rig), other);
        EXPECT_THAT(shown(), IsEmpty());
    }
}

TEST_F(LoadingFailures, TheShapesOfTheModelBeforeAreForgotten) {
    writeChanged([](ModelSpec& spec) { spec.shapes = {spec.bias}; });
    makeRig();
    ASSERT_EQ(rig->deform(0), HStatus::kSuccess);
    EXPECT_EQ(rig->state(0)->principalShapeCount, 1U);
    EXPECT_EQ(rig->state(0)->principalVertCount, 9U);
    fs::remove(file("principal_shapes.json"));
    fs::remove(file("model.onnx")); // not even a failed load leaves them
    setModelName("model");
    deform();
    takeMessages();
    EXPECT_EQ(rig->state(0)->principalShapeCount, 0U);
    EXPECT_EQ(rig->state(0)->principalVertCount, 0U);
    EXPECT_THAT(rig->state(0)->principalShapes, IsEmpty());
}

TEST_F(LoadingFailures, ErrorsAreForWhoIsLooking) {
    writeChanged([](ModelSpec& spec) {
        spec.fullCount = 10;
        spec.affectCount = 8;
    });
    makeRig();
    const Texts all{fullCountMismatch(10), affectCountMismatch(8), modelInvalid, report(otherVertices)};
    const Texts ungated{affectCountMismatch(8), report(otherVertices)};
    const auto expect = [&](bool isPlaying, bool isScrubbing, const Texts& messages) {
        OpenQuarn::Animation::setPlaying(isPlaying);
        OpenQuarn::Animation::setScrubbing(isScrubbing);
        setModelName("model");
        EXPECT_EQ(rig->deform(0), HStatus::kSuccess);
        EXPECT_EQ(shown(), messages);
    };
    expect(true, false, ungated);
    expect(false, true, ungated);
    expect(false, false, all);
    OpenQuarn::EvaluationContext context(12.0);
    HStatus status;
    context.evaluateAt(rig->output(0), &status);
    EXPECT_EQ(status, HStatus::kSuccess);
    EXPECT_EQ(shown(), ungated);
}

TEST_F(LoadingFailures, FilesThatWereFoundAreCounted) {
    writeModel(modelDirectory(), modelSpec());
    makeRig();
    const auto eventsOf = [&](const std::string& bytes) {
        OpenQuarn::Usage::clear();
        fs::remove(file("model.onnx"));
        if (!bytes.empty())
            writeFile(file("model.onnx"), bytes);
        setModelName("model");
        deform();
        deform();
        takeMessages();
        std::string events;
        for (const auto& [name, count] : OpenQuarn::Usage::events())
            events += name + " " + std::to_string(count);
        return events;
    };
    EXPECT_EQ(eventsOf(networkBytes(modelSpec())), "QUARN.NEURAL_WARP_LOADED_MODEL 1");
    EXPECT_EQ(eventsOf("no network"), "QUARN.NEURAL_WARP_LOADED_MODEL 1");
    EXPECT_EQ(eventsOf(""), "");
}

} // namespace
