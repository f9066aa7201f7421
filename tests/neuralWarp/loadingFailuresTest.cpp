// SPDX-License-Identifier: Apache-2.0
// Everything that can be wrong with a model directory: what is said, what happens to the geometry and to the flags, and
// when it is tried again.
#include "neuralWarp/support/FailureTest.h"

#include "openquarn_app/Animation.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Usage.h"

#include <functional>

namespace {

namespace fs = std::filesystem;
using stateText::never;
using testing::ElementsAre;
using testing::IsEmpty;

const std::string unnamedFailure = "failure";
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
    struct Step {
        Texts messages;
        Points points;
        std::string flags;
        std::vector<std::uint32_t> versions;
        std::string printed = {}; ///< on standard output
    };
    struct Row {
        const char* name;
        std::function<void(LoadingFailures&)> spoil;
        std::vector<Step> steps; ///< one evaluation each; after the last, nothing changes any more
        std::string printed;     ///< on standard output, in the first of them
    };

    // --- what follows from a failing step of loading ---

    static std::vector<Step> directoryFails(const Texts& messages) {
        const std::vector<std::uint32_t> built{0, 0, 0, never, never};
        return {{messages, Points::asTheyCame, "load metadata", built},
                {{}, Points::asTheyCame, "load", built},
                {{}, Points::rounded, "", {0, 1, 0, never, 0}}};
    }
    static std::vector<Step> metadataFails(const Texts& messages) {
        return {{messages, Points::asTheyCame, "load", {0, 0, 0, never, never}},
                {{fullCountMismatch(0), affectCountMismatch(0), modelInvalid, report(unnamedFailure)},
                 Points::rounded,
                 "",
                 {0, 1, 0, never, 0}}};
    }
    static std::vector<Step> validationFails(const Texts& messages) {
        return {{messages, Points::rounded, "", {0, 0, 0, never, 0}}};
    }
    static std::vector<Step> networkFails(const Texts& messages) {
        return {{messages, Points::rounded, "valid", {0, 0, 0, 0, 0}}};
    }
    static std::vector<Step> loads(const Texts& messages, const char* flags = "applied valid") {
        return {{messages, Points::moved, flags, {0, 0, 0, 0, 0}}};
    }

    // --- the rig ---

    warpRig::Rig& makeRig() {
        rig_.emplace();
        rig_->addGeometry(0, {.mesh = unevenMesh()});
        rig_->setModelRoot(folder.path());
        rig_->setControls({1.0});
        return *rig_;
    }
    void setModelName(const std::string& name) const { rig_->plug("models[0].modelName").setString(name); }
    void setRoot(const std::string& root) const { rig_->plug("modelRoot").setString(root); }
    fs::path file(const char* name) const { return modelDirectory() / name; }
    void loopAt(const fs::path& path) const {
        fs::remove_all(path);
        fs::create_symlink(path.filename(), path);
    }
    void write(void (*change)(ModelSpec&)) const {
        ModelSpec spec = modelSpec();
        change(spec);
        writeModel(modelDirectory(), spec);
    }

    /// What the evaluation prints.
    std::string deform() const {
        StdoutCapture out;
        const HStatus status = rig_->deform(0);
        std::string printed = withoutFolder(out.take());
        EXPECT_EQ(status, HStatus::kSuccess);
        return printed;
    }

    void expectStep(const Step& step) {
        EXPECT_EQ(deform(), step.printed);
        EXPECT_EQ(shown(), step.messages);
        EXPECT_EQ(result(*rig_), step.points == Points::moved     ? moved_
                                 : step.points == Points::rounded ? rounded()
                                                                  : came());
        EXPECT_EQ(stateText::raised(*rig_->state(0)), step.flags);
        EXPECT_EQ(rig_->state(0)->cacheVersions, step.versions);
    }

    void expectRow(const Row& row);

    std::optional<warpRig::Rig> rig_;
    Coordinates moved_;
};

void LoadingFailures::expectRow(const Row& row) {
    writeModel(modelDirectory(), modelSpec());
    makeRig();
    if (moved_.empty()) {
        ASSERT_EQ(rig_->deform(0), HStatus::kSuccess);
        moved_ = result(*rig_);
        ASSERT_NE(moved_, rounded());
        session.newScene();
        makeRig();
    }
    row.spoil(*this);
    std::vector<Step> steps = row.steps;
    steps.front().printed = row.printed;
    steps.push_back({{}, steps.back().points, steps.back().flags, steps.back().versions}); // not tried again
    if (steps.back().versions[1] == 0)
        ++steps.back().versions[1]; // nothing is smoothed: what was built at first is released
    for (const Step& step : steps)
        expectStep(step);
    const std::function<void()> triggers[] = {
        [&] { setModelName(rig_->plug("models[0].modelName").asString().asStdString()); },
        [&] { setRoot(rig_->plug("modelRoot").asString().asStdString()); },
        [&] { EXPECT_TRUE(OpenQuarn::runCommand("neuralWarp -multiIndex 0 -reloadModel warp1")); },
    };
    for (const auto& trigger : triggers) {
        trigger();
        const std::string flags = stateText::raised(*rig_->state(0));
        EXPECT_EQ(flags.substr(0, 18), "load metadata path");
        EXPECT_EQ(deform(), row.printed);
        EXPECT_EQ(shown(), row.steps.front().messages);
    }

    fs::remove_all(modelDirectory());
    writeModel(modelDirectory(), modelSpec());
    setRoot(folder.path().string());
    setModelName("model");
    EXPECT_EQ(rig_->deform(0), HStatus::kSuccess);
    EXPECT_EQ(stateText::raised(*rig_->state(0)), "applied valid");
    EXPECT_EQ(result(*rig_), moved_);
    EXPECT_THAT(shown(), IsEmpty());
    session.newScene();
}

TEST_F(LoadingFailures, OfTheDirectory) {
    using T = LoadingFailures;
    const Row rows[] = {
        {"no root", [](T& t) { t.setRoot(""); }, directoryFails({noPath}), ""},
        {"missing root", [](T& t) { t.setRoot("/no/such folder"); }, directoryFails({badPath("/no/such folder")}), ""},
        {"no name", [](T& t) { t.setModelName(""); }, directoryFails({noPath}), ""},
        {"missing directory", [](T& t) { t.setModelName("other.onnx"); }, directoryFails({badPath("ROOT/other.nwrp")}),
         ""},
        {"a file instead",
         [](T& t) {
             fs::remove_all(t.modelDirectory());
             writeFile(t.modelDirectory(), "not a directory");
         },
         directoryFails({badPath("ROOT/model.nwrp")}), ""},
        {"below a file", [](T& t) { t.setRoot(t.file("model.onnx").string()); },
         directoryFails({badPath("ROOT/model.nwrp/model.onnx/model.nwrp")}), ""},
        {"root that cannot be looked up",
         [](T& t) {
             t.loopAt(t.folder.path() / "loop");
             t.setRoot((t.folder.path() / "loop").string());
         },
         directoryFails({report("'ROOT/loop' cannot be looked up: Too many levels of symbolic links")}), ""},
        {"name that is too long", [](T& t) { t.setModelName(std::string(300, 'n')); },
         directoryFails({report("'ROOT/" + std::string(300, 'n') + ".nwrp' cannot be looked up: File name too long")}),
         ""},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        expectRow(row);
    }
}

TEST_F(LoadingFailures, OfTheMetadata) {
    using T = LoadingFailures;
    const std::string badMetadata =
        "error: [NEURAL WARP \"warp1\"] Failed to load metadata from ROOT/model.nwrp/metadata.json";
    const Row rows[] = {
        {"missing", [](T& t) { fs::remove(t.file("metadata.json")); }, metadataFails({}), ""},
        {"malformed", [](T& t) { writeFile(t.file("metadata.json"), "{"); }, metadataFails({badMetadata}),
         "Parse error\n"},
        {"unreadable",
         [](T& t) {
             fs::remove(t.file("metadata.json"));
             fs::create_directory(t.file("metadata.json"));
         },
         metadataFails({badMetadata}), "Failed to open metadata file stream\n"},
        {"cannot be looked up", [](T& t) { t.loopAt(t.file("metadata.json")); },
         metadataFails(
             {report("'ROOT/model.nwrp/metadata.json' cannot be looked up: Too many levels of symbolic links")}),
         ""},
        {"another vertex count", [](T& t) { t.write([](ModelSpec& spec) { spec.fullCount = 10; }); },
         validationFails({fullCountMismatch(10), modelInvalid, report(unnamedFailure)}), ""},
        {"both counts", [](T& t) { t.write([](ModelSpec& spec) { spec.fullCount = spec.affectCount = 0; }); },
         validationFails({fullCountMismatch(0), affectCountMismatch(0), modelInvalid, report(unnamedFailure)}), ""},
        {"another affected count", [](T& t) { t.write([](ModelSpec& spec) { spec.affectCount = 7; }); },
         loads({affectCountMismatch(7)}), ""},
        {"another order of vertices",
         [](T& t) {
             t.write([](ModelSpec& spec) {
                 spec.subsetState = "partial";
                 spec.affectMap = {8, 7, 6, 5, 4, 3, 2, 1, 0};
                 spec.componentTagExpression = "face";
                 for (std::size_t i = 0; i < 4; ++i) // as many slots back
                     std::swap_ranges(&spec.bias[3 * i], &spec.bias[3 * i] + 3, &spec.bias[3 * (8 - i)]);
             });
         },
         loads({"warning: [NEURAL WARP \"warp1\", multiIndex 0] Setup for multiIndex 0 not the same as for trained "
                "model. Using deltas on 9 of 9 affected verts. Trained model subset is \"face\""},
               "applied valid affectMap"),
         ""},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        expectRow(row);
    }
}

TEST_F(LoadingFailures, OfTheNetworkAndItsShapes) {
    using T = LoadingFailures;
    const std::string printed = "[NEURAL WARP] ERROR, Failed to load the ONNX model ROOT/model.nwrp/model.onnx\n";
    const Row rows[] = {
        {"missing", [](T& t) { fs::remove(t.file("model.onnx")); },
         networkFails({badPath("ROOT/model.nwrp/model.onnx"), modelInit}), ""},
        {"damaged", [](T& t) { writeFile(t.file("model.onnx"), "no network"); }, networkFails({modelInit}), printed},
        {"a directory",
         [](T& t) {
             fs::remove(t.file("model.onnx"));
             fs::create_directory(t.file("model.onnx"));
         },
         networkFails({modelInit}), printed},
        {"cannot be looked up", [](T& t) { t.loopAt(t.file("model.onnx")); }, networkFails({modelInit}), printed},
        {"bad shapes", [](T& t) { writeFile(t.file("principal_shapes.json"), "[1"); }, loads({}), "Parse error\n"},
        {"shapes of another count",
         [](T& t) {
             writeFile(t.file("principal_shapes.json"),
                       R"({"principalShapeCount":2,"vertCount":1,"principalShapes":[[1,2,3]]})");
         },
         loads({}), "Error: principalShapeCount does not match the number of principal shapes\n"},
        {"shapes that cannot be looked up",
         [](T& t) { t.loopAt(t.file("principal_shapes.json")); },
         {{{report("'ROOT/model.nwrp/principal_shapes.json' cannot be looked up: Too many levels of symbolic links")},
           Points::rounded,
           "",
           {0, 0, 0, 0, 0}}},
         ""},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        expectRow(row);
    }
}

TEST_F(LoadingFailures, TheExtensionOfANameIsReplaced) {
    writeModel(modelDirectory(), modelSpec());
    makeRig();
    for (const char* name : {"model", "model.nwrp", "model.", "model.onnx"}) {
        setModelName(name);
        ASSERT_EQ(rig_->deform(0), HStatus::kSuccess);
        EXPECT_EQ(rig_->state(0)->modelDirectory, modelDirectory()) << name;
        EXPECT_TRUE(rig_->state(0)->modelApplied) << name;
        EXPECT_EQ(rig_->state(0)->principalShapeCount, 0U);
    }
}

TEST_F(LoadingFailures, AModelThatIsOffIsLoadedWhenItIsSwitchedOn) {
    makeRig();
    rig_->plug("models[0].modelActive").setShort(0);
    expectStep({{}, Points::asTheyCame, "load metadata path", {0, 0, 0, never, never}});
    rig_->plug("models[0].modelActive").setShort(1);
    expectStep(directoryFails({badPath("ROOT/model.nwrp")}).front());
}

TEST_F(LoadingFailures, ErrorsAreForWhoIsLooking) {
    write([](ModelSpec& spec) {
        spec.fullCount = 10;
        spec.affectCount = 8;
    });
    makeRig();
    const Texts all{fullCountMismatch(10), affectCountMismatch(8), modelInvalid, report(unnamedFailure)};
    const Texts ungated{affectCountMismatch(8), report(unnamedFailure)};
    using OpenQuarn::Animation;
    struct Moment {
        bool isPlaying, isScrubbing;
        Texts messages;
    };
    for (const Moment& moment :
         {Moment{true, false, ungated}, Moment{false, true, ungated}, Moment{false, false, all}}) {
        Animation::setPlaying(moment.isPlaying);
        Animation::setScrubbing(moment.isScrubbing);
        setModelName("model");
        EXPECT_EQ(rig_->deform(0), HStatus::kSuccess);
        EXPECT_EQ(shown(), moment.messages);
    }
    OpenQuarn::EvaluationContext context(12.0);
    HStatus status;
    context.evaluateAt(rig_->output(0), &status);
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

TEST_F(LoadingFailures, OfADescription) {
    writeModel(modelDirectory(), modelSpec());
    warpRig::Rig& rig = makeRig();
    rig.addGeometry(1, {.mesh = unevenMesh(), .hasModelElement = false});
    ASSERT_EQ(rig.deform(0), HStatus::kSuccess);
    EXPECT_EQ(rig.deform(1), HStatus::kFailure);
    takeMessages();
    const std::string noElement = report("'warp1.models' has no element 1");
    struct Description {
        const char* name;
        unsigned index;
        std::function<void()> change;
        HStatus::Code status;
        std::string text;
        Texts messages;
        std::string flags;
    };
    const Description rows[] = {
        {"loaded",
         0,
         [] {},
         HStatus::kSuccess,
         "{'rootPath' : 'ROOT' ,'modelPath' : 'ROOT/model.nwrp'}",
         {},
         "applied valid"},
        {"due",
         0,
         [&] { setModelName("model.x"); },
         HStatus::kSuccess,
         "{'rootPath' : 'ROOT' ,'modelPath' : 'ROOT/model.nwrp'}",
         {},
         "load metadata applied valid"},
        {"missing directory",
         0,
         [&] { setModelName("other"); },
         HStatus::kFailure,
         "",
         {badPath("ROOT/other.nwrp"), report(unnamedFailure)},
         "load metadata applied valid"},
        {"known to be missing",
         0,
         [] {},
         HStatus::kSuccess,
         "{'rootPath' : 'ROOT' ,'modelPath' : ''}",
         {},
         "load metadata applied valid"},
        {"no root",
         0,
         [&] { setRoot(""); },
         HStatus::kFailure,
         "",
         {noPath, report(unnamedFailure)},
         "load metadata applied valid"},
        {"no element",
         1,
         [&] { setRoot(folder.path().string()); },
         HStatus::kFailure,
         "",
         {noElement, noElement},
         "topology indexMap connections restFrames load metadata"},
        {"no state", 2, [] {}, HStatus::kFailure, "", {}, ""},
    };
    for (const Description& row : rows) {
        SCOPED_TRACE(row.name);
        row.change();
        HString text("before");
        EXPECT_EQ(nodeOf(rig).describeModel(row.index, text), row.status);
        EXPECT_EQ(withoutFolder(text.asStdString()), row.text);
        EXPECT_EQ(shown(), row.messages);
        const neuralWarp::neuralWarpData* state = rig.state(row.index);
        EXPECT_EQ(state ? stateText::raised(*state) : "", row.flags);
    }
}

} // namespace
