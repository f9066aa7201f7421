// SPDX-License-Identifier: Apache-2.0
// Everything that can be wrong with a model directory: what is said, what happens to the geometry and to the flags, and
// when it is tried again.
#include "plugin/deformer/support/FailureTest.h"

#include "openquarn_app/Animation.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Usage.h"
#include "storage/byteOrder.h"
#include "storage/fileSum.h"
#include "support/npzBytes.h"

#include <bit>
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
    for (const bool isPlaying : {false, true}) { // errors are for who is looking
        OpenQuarn::Animation::setPlaying(isPlaying);
        EXPECT_TRUE(OpenQuarn::runCommand("neuralWarp -multiIndex 0 -reloadModel warp1"));
        EXPECT_EQ(deform(), row.printed);
        Texts messages = row.outcome.messages;
        std::erase_if(messages, [&](const std::string& text) { return isPlaying && text.starts_with("error: "); });
        EXPECT_EQ(shown(), messages);
    }
    OpenQuarn::Animation::setPlaying(false);

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
    const std::string unusable =
        report("'ROOT/model.nwrp/model.onnx' cannot be used: the file is damaged, or no ONNX file");
    const auto asShape = [](ModelSpec& spec) {
        spec.shapes = {spec.bias};
        spec.bias = {1.0F};
    };
    expectRows({
        {"missing", gone(file), networkFails({badPath("ROOT/model.nwrp/model.onnx"), modelInit})},
        {"damaged", text(file, "no network"), networkFails({modelInit, unusable}), printed},
        {"shapes", written(asShape), loads({})}, // which the model after it does not have
        {"bad shapes", text(shapes, "[1"), loads({}), "Parse error\n"},
        {"loop instead of shapes", loopAt(shapes), networkFails({unanswered("model.nwrp/principal_shapes.json")}, "")},
    });
}

/// The text has other numbers than the archive that names it: which of them came shows in the result.
TEST_F(LoadingFailures, ShapesComeFromTheirArchive) {
    const ModelSpec direct = modelSpec();
    writeModel(modelDirectory(), direct);
    makeRig();
    EXPECT_EQ(deform(), "");
    const Coordinates wanted = result(*rig);
    writeChanged([](ModelSpec& spec) { spec.bias = {1.0F}; });
    std::string zeros = "0";
    for (std::size_t i = 1; i < direct.bias.size(); ++i)
        zeros += ",0";
    writeFile(file("principal_shapes.json"),
              R"({"principalShapeCount": 1, "principalVertCount": 9, "principalShapes": [[)" + zeros + "]]}");
    const std::string digits = storage::sumOfFile(file("principal_shapes.json"), UINT64_MAX, 0).digits;
    std::string halves;
    for (unsigned number = 1; number <= direct.bias.size(); ++number) { // in eighths, as halves
        const unsigned exponent = std::bit_width(number) - 1U;
        storage::putLittle(halves,
                           static_cast<std::uint16_t>((exponent + 15U) << 10U | (number << 10U >> exponent & 0x3FFU)));
    }
    std::string eighth;
    storage::putLittle(eighth, 0.125F);
    for (const std::string& archive :
         {shapesArchive(digits, direct.bias, 1), npzBytes({{"json_xxh3_128", npyBytes("|S32", {}, digits)},
                                                           {"shapes", npyBytes("<f2", {9, 1, 3}, halves)},
                                                           {"scales", npyBytes("<f4", {1}, eighth)}})}) {
        writeFile(file("principal_shapes.npz"), archive);
        setModelName("model");
        EXPECT_EQ(deform(), "");
        EXPECT_EQ(result(*rig), wanted);
        EXPECT_THAT(shown(), IsEmpty());
    }
    fs::remove(file("principal_shapes.npz"));
    setModelName("model");
    EXPECT_EQ(deform(), "");
    EXPECT_EQ(result(*rig), rounded());
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

TEST_F(LoadingFailures, FilesThatWereFoundAreCounted) {
    writeModel(modelDirectory(), modelSpec());
    makeRig();
    const std::string once = "QUARN.NEURAL_WARP_LOADED_MODEL 1";
    const std::pair<Spoil, std::string> rows[] = {{text("model.onnx", networkBytes(modelSpec())), once},
                                                  {text("model.onnx", "no network"), once},
                                                  {gone("model.onnx"), ""}};
    for (const auto& [spoil, expected] : rows) {
        OpenQuarn::Usage::clear();
        spoil(*this);
        setModelName("model");
        deform();
        deform();
        takeMessages();
        std::string events;
        for (const auto& [name, count] : OpenQuarn::Usage::events())
            events += name + " " + std::to_string(count);
        EXPECT_EQ(events, expected);
    }
}

} // namespace
