// SPDX-License-Identifier: Apache-2.0
// What is loaded of a model directory, and what is refused.
#include "DeformTest.h"

#include "nw_model/CaughtLines.h"
#include "support/StdoutCapture.h"

#include <functional>
#include <thread>

namespace {

using neuralWarp::Model;
using testing::HasSubstr;

class ModelLoad : public DeformTest {};

/// Something wrong with a directory, and what is said of it.
struct Spoilt {
    const char* name;
    std::function<void(const std::filesystem::path&)> spoil;
    const char* said;
    bool isMissing = false;
};

TEST_F(ModelLoad, RefusesWithFileAndReasonAndPrintsNothing) {
    namespace fs = std::filesystem;
    const auto metadata = [](const std::string& rest) {
        return [rest](const fs::path& at) {
            writeFile(at / "metadata.json", R"({"subsetState": "complete", "fullCount": 9, )" + rest + "}");
        };
    };
    const std::vector<Spoilt> rows{
        {"nothing there", [](const fs::path& at) { fs::remove_all(at); }, "grid.nwrp' does not exist", true},
        {"a file",
         [](const fs::path& at) {
             fs::remove_all(at);
             writeFile(at, "text");
         },
         "grid.nwrp' cannot be used: a model is a directory"},
        {"no metadata", [](const fs::path& at) { fs::remove(at / "metadata.json"); }, "metadata.json' does not exist",
         true},
        {"metadata of a folder",
         [](const fs::path& at) {
             fs::remove(at / "metadata.json");
             fs::create_directory(at / "metadata.json");
         },
         "metadata.json"},
        {"no JSON", [](const fs::path& at) { writeFile(at / "metadata.json", "{"); },
         "metadata.json' cannot be used: Parse error"},
        {"an unknown mode", metadata(R"("deltaMode": 7)"), "deltaMode is 7"},
        {"a vertex beyond", metadata(R"("affectMap": [3, 9])"), "drives vertex 9, and its mesh has 9 vertices"},
        {"a larger mesh",
         [](const fs::path& at) { writeFile(at / "metadata.json", R"({"subsetState": "complete", "fullCount": 10})"); },
         "has deltas for 9 vertices, and its metadata.json drives 10"},
        {"no network", [](const fs::path& at) { fs::remove(at / "model.onnx"); }, "model.onnx' does not exist", true},
        {"no ONNX", [](const fs::path& at) { writeFile(at / "model.onnx", "text"); }, "model.onnx' cannot be used: "},
        {"bad shapes",
         [](const fs::path& at) {
             writeFile(at / "principal_shapes.json", R"({"principalShapeCount": 2, "vertCount": 9})");
         },
         "principal_shapes.json' cannot be used: Error: principalShapeCount does not match"},
        {"too many shapes",
         [](const fs::path& at) {
             std::string list = "[]";
             for (int shape = 0; shape < 28; ++shape)
                 list.insert(1, shape == 0 ? "[1,2,3]" : "[1,2,3],");
             writeFile(at / "principal_shapes.json",
                       R"({"principalShapeCount": 28, "vertCount": 1, "principalShapes": )" + list + "}");
         },
         "gives 27 coefficients for 28 principal shapes"},
        {"shapes of fewer vertices",
         [](const fs::path& at) {
             writeFile(at / "principal_shapes.json",
                       R"({"principalShapeCount": 1, "vertCount": 2, "principalShapes": [[1,2,3,4,5,6]]})");
         },
         "has deltas for 2 vertices, and its metadata.json drives 9"}};
    for (const Spoilt& row : rows) {
        SCOPED_TRACE(row.name);
        std::filesystem::remove_all(directory);
        write();
        row.spoil(directory);
        StdoutCapture printed;
        std::string said;
        bool isMissing = false;
        try {
            Model::load(directory);
        } catch (const neuralWarp::FileMissing& error) {
            said = error.what();
            isMissing = true;
        } catch (const std::invalid_argument& error) {
            said = error.what();
        }
        EXPECT_EQ(printed.take(), "");
        EXPECT_THAT(said, HasSubstr(row.said));
        EXPECT_EQ(isMissing, row.isMissing);
    }
}

TEST_F(ModelLoad, KnowsItsRangesOrSaysWhyNot) {
    std::shared_ptr<const Model> model = Model::load(directory);
    EXPECT_THAT(model->certificateProblem(), HasSubstr("no certificate"));
    EXPECT_EQ(model->controlCalled(0), "control 0");
    const std::vector<float> controls{5.0F};
    EXPECT_THAT(failureOf([&] { model->distance(controls); }), HasSubstr("does not know its ranges"));
    EXPECT_FALSE(model->expectedError(controls));
    const auto certify = [&](const std::string& minima, const std::string& names) {
        writeFile(directory / "metadata.json",
                  R"({"subsetState": "complete", "fullCount": 9, "controlNames": )" + names +
                      R"(, "certificate": {"trainingFrames": 2, "errors": [], "controls": {"minima": )" + minima +
                      R"(, "maxima": )" + minima + "}}}");
        model = Model::load(directory);
    };
    certify("[1]", R"(["bend"])");
    EXPECT_EQ(model->controlCalled(0), "control 0 ('bend')");
    EXPECT_GT(model->distance(controls), 0.0);
    certify("[1, 1]", R"(["bend", "twist"])");
    EXPECT_THAT(model->certificateProblem(), HasSubstr("of 2 controls, and the network takes 1"));
    EXPECT_FALSE(model->certificate());
}

TEST_F(ModelLoad, SessionsAreOfTheDirectoryThatWasLoaded) {
    const std::shared_ptr<const Model> model = Model::load(directory);
    auto first = model->takeSession();
    auto second = model->takeSession();
    EXPECT_NE(first, second);
    const auto* const known = first.get();
    model->giveBack(std::move(first));
    write(2.0F);
    first = model->takeSession();
    EXPECT_EQ(first.get(), known);
    EXPECT_EQ(first->run(std::vector<float>{1.0F}).at(2), 1.0F);
    EXPECT_THAT(failureOf([&] { model->takeSession(); }), HasSubstr("is another model now"));
}

TEST(CaughtLines, AreThoseOfTheirThread) {
    const std::filesystem::path none = "/none/metadata.json";
    const std::string line = "Failed to open metadata file stream\n";
    neuralWarp::ModelMetadata record;
    StdoutCapture printed;
    const neuralWarp::CaughtLines outer;
    {
        const neuralWarp::CaughtLines inner;
        readMetadataFile(record, none);
        EXPECT_EQ(inner.text(), line);
    }
    EXPECT_EQ(outer.text(), "");
    std::thread([&] { readMetadataFile(record, none); }).join();
    readMetadataFile(record, none);
    EXPECT_EQ(outer.text(), line);
    EXPECT_EQ(printed.take(), line);
}

} // namespace
