// SPDX-License-Identifier: Apache-2.0
#include "nw_model/ModelSession.h"

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <list>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <sys/stat.h>

#include "support.h"

using namespace neuralWarp;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

namespace fs = std::filesystem;

namespace {

constexpr const char* unsupported = "[NEURAL WARP] WARNING, unsupported ml model type\n";

std::string loadError(const fs::path& path) {
    return "[NEURAL WARP] ERROR, Failed to load the ONNX model " + path.string() + "\n";
}

/// Loads `path` over a session that runs well; nothing of the old model may be left to run.
void expectNoSession(const fs::path& path, LoadResult result, const std::string& reason) {
    ModelSession session;
    ASSERT_EQ(session.load(testModel("direct"), true), LoadResult::Loaded);
    StdoutCapture out;
    EXPECT_EQ(session.load(path, true), result) << path;
    EXPECT_EQ(out.take(), result == LoadResult::NotFound ? "" : loadError(path));
    EXPECT_THAT(session.errorText(), HasSubstr(reason)) << path;
    EXPECT_EQ(session.lastResult(), result) << path;
    EXPECT_EQ(session.modelPath(), path);
    EXPECT_EQ(session.type(), ModelType::OnnxType) << path;
    EXPECT_FALSE(session.isLoaded()) << path;
    EXPECT_EQ(session.inputCount(), result == LoadResult::Loaded ? 0 : 7) << path; // 0 after a build that failed
    EXPECT_THAT(session.run(std::vector<float>(7)), IsEmpty()) << path;
}

void copyModel(const fs::path& to) {
    fs::copy_file(testModel("direct"), to, fs::copy_options::overwrite_existing);
}

/// A part of a protocol buffer: `tag` is its field and kind, as bytes.
std::string part(const std::string& tag, const std::string& bytes) {
    std::string size;
    for (std::size_t rest = bytes.size(); rest > 0 || size.empty(); rest >>= 7U)
        size.push_back(static_cast<char>((rest & 127U) | (rest >= 128 ? 128U : 0U)));
    return tag + size + bytes;
}

const std::string entryTag = "r", keyTag = "\n", valueTag = "\x12"; // fields 14 of the file, 1 and 2 of the entry

std::string entry(const std::string& value) {
    return part(entryTag, part(keyTag, "ort_config") + part(valueTag, value));
}

std::string threads(const std::string& count) {
    return R"({"session_options": {"intra_op_num_threads": )" + count + "}}";
}

/// A network that can be run, with more bytes behind its own: parts in any order make one file.
std::string networkWith(const std::string& more) {
    std::ifstream file(testModel("direct"), std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(file), {}) + more;
}

/// The variable by which the runtime reads the entry; null: none.
void setOptionsVariable(const char* value) {
    ::unsetenv(modelOptionsVariable);
    if (value != nullptr)
        ::setenv(modelOptionsVariable, value, 1);
}

std::ptrdiff_t threadsOfProcess() {
    return std::distance(fs::directory_iterator("/proc/self/task"), fs::directory_iterator());
}

} // namespace

TEST(ModelSessionLoad, FreshSessionHasNothingToRun) {
    ModelSession session;
    EXPECT_EQ(session.lastResult(), LoadResult::NotLoaded);
    EXPECT_EQ(session.type(), ModelType::UnrecognizedType);
    EXPECT_EQ(session.modelPath(), fs::path());
    EXPECT_FALSE(session.isLoaded());
    StdoutCapture out;
    EXPECT_EQ(session.inputCount(), 0);
    EXPECT_THAT(session.run(std::vector<float>{1}), IsEmpty());
    EXPECT_EQ(out.take(), std::string(unsupported) + unsupported);
}

TEST(ModelSessionLoad, FileTypeIsTheTextFromTheLastDot) {
    const std::vector<std::pair<ModelType, std::vector<std::string>>> cases = {
        {ModelType::TorchType, {"a.pt", "a.onnx.pth", ".pt"}},
        {ModelType::H5Type, {"a.h5", "model"}},
        {ModelType::UnrecognizedType, {"a.ONNX", "a.PT", "a.onnx ", "a.", "a.json", ".hidden", "..."}}};
    const TestFolder folder;
    for (const auto& [type, names] : cases) {
        for (const std::string& name : names) {
            ModelSession session;
            const fs::path path = folder.write(name, "");
            StdoutCapture out;
            EXPECT_EQ(session.load(path, true), LoadResult::NotRecognized) << name;
            EXPECT_EQ(session.type(), type) << name;
            EXPECT_EQ(session.isLoaded(), type != ModelType::UnrecognizedType) << name;
            EXPECT_EQ(session.inputCount(), 0) << name;
            EXPECT_THAT(session.run(std::vector<float>{1}), IsEmpty()) << name;
            EXPECT_EQ(out.take(), std::string(unsupported) + unsupported) << name;
        }
    }
    // a dot in a folder's name is none of the file's; the folders themselves have no extension
    fs::create_directory(folder / "x.onnx");
    for (const char* name : {"x.onnx/", "x.onnx/.", "x.onnx/.."}) {
        ModelSession session;
        EXPECT_EQ(session.load(folder / name, true), LoadResult::NotRecognized) << name;
        EXPECT_EQ(session.type(), ModelType::H5Type) << name;
    }
}

TEST(ModelSessionLoad, MissingFileIsNotFound) {
    const TestFolder folder;
    const fs::path file = folder.write("file", "");
    for (const fs::path& path :
         std::vector<fs::path>{"", folder / "model.onnx", folder / "missing/model.onnx", file / "model.onnx"}) {
        expectNoSession(path, LoadResult::NotFound, "");
        ModelSession fresh;
        EXPECT_EQ(fresh.load(path, true), LoadResult::NotFound) << path;
        EXPECT_EQ(fresh.type(), ModelType::UnrecognizedType) << path;
        EXPECT_FALSE(fresh.isLoaded()) << path;
    }
}

TEST(ModelSessionLoad, UnansweredFileQueryIsNotLoaded) {
    const TestFolder folder;
    const fs::path link = folder / "loop.onnx";
    fs::create_symlink(link, link);
    expectNoSession(link, LoadResult::NotLoaded, "Too many levels of symbolic links");
    expectNoSession(folder / (std::string(300, 'x') + ".onnx"), LoadResult::NotLoaded, "File name too long");
}

TEST(ModelSessionLoad, UnusableModelsAreRefused) {
    const std::vector<std::pair<std::string, std::string>> cases = {
        {"bad_input_scalar", "the input is a scalar or has no declared shape"},
        {"bad_input_shapeless", "the input is a scalar or has no declared shape"},
        {"bad_input_rank2", "the input has more than one dimension"},
        {"bad_input_zero", "the input has an unknown, zero or too large dimension"},
        {"bad_input_symbolic", "the input has an unknown, zero or too large dimension"},
        {"bad_input_negative", "the input has an unknown, zero or too large dimension"},
        {"bad_input_too_large", "the input has an unknown, zero or too large dimension"},
        {"bad_input_low_bits", "the input has an unknown, zero or too large dimension"},
        {"bad_input_double", "the input is not float32"},
        {"bad_output_double", "the first output is not float32"},
        {"bad_output_scalar", "the first output is a scalar or has no declared shape"},
        {"bad_output_shapeless", "the first output is a scalar or has no declared shape"},
        {"bad_output_symbolic", "the first output has an unknown, zero or too large dimension"},
        {"bad_output_zero", "the first output has an unknown, zero or too large dimension"},
        {"bad_output_negative", "the first output has an unknown, zero or too large dimension"},
        {"bad_output_overflow", "the first output has an unknown, zero or too large dimension"},
        {"bad_output_sequence", "the first output is not a tensor"},
        {"bad_pass_through", "the first output is the input itself"},
        {"bad_two_inputs", "the model does not have exactly one input"},
        {"bad_no_input", "the model does not have exactly one input"},
        {"bad_no_output", "the model has no output"},
        {"bad_operator", "NoSuchOperator"},
        {"bad_truncated", "it ends in the middle of a part"},
        {"bad_text", "the file is damaged, or no ONNX file"},
        {"bad_protobuf", "Protobuf parsing failed"},
        {"bad_empty", "does not have a graph"},
        {"bad_input_huge", "the input has 1000000000 values, and at most 1048576 are taken"},
        {"bad_output_huge", "the first output has 2000000000 values, and at most 134217728 are taken"},
        {"bad_loop_endless", "a Loop whose number of rounds is not a constant"},
        {"bad_loop_computed", "a Loop whose number of rounds is not a constant"},
        {"bad_loop_long", "its loops make more than 10000 rounds"},
        {"bad_loop_nested", "its loops make more than 10000 rounds"},
        {"bad_loop_in_function", "a Loop whose number of rounds is not a constant"},
        {"bad_external", "data of the network lie in another file"},
        {"bad_external_constant", "data of the network lie in another file"},
        {"bad_external_in_branch", "data of the network lie in another file"},
        {"bad_nested_deep", "its parts are nested too deep"}};
    std::size_t files = 0;
    for (const auto& entry : fs::directory_iterator(NW_TEST_MODELS)) {
        files += entry.path().filename().string().rfind("bad_", 0) == 0 ? 1u : 0u;
    }
    EXPECT_EQ(files, cases.size()) << "a bad model is not in the table";
    for (const auto& [name, reason] : cases) {
        expectNoSession(testModel(name), LoadResult::Loaded, reason);
    }
}

TEST(ModelSessionLoad, OptionsInTheMetadataAreOnlyNumbersOfThreads) {
    const std::string cores = std::to_string(std::max(std::thread::hardware_concurrency(), 1U));
    const std::string number = "must give a whole number from 1 to " + cores, one = threads("1");
    const auto options = [](const std::string& text) { return entry("{\"session_options\": " + text + "}"); };
    const std::vector<std::pair<std::string, std::string>> cases = {
        {options(R"({"enable_profiling": 1})"), "sets \"enable_profiling\", and may only set numbers of threads"},
        {options(R"({"intra_op_num_threads": 1, "graph_optimization_level": 99})"),
         "sets \"graph_optimization_level\""},
        {options(R"({"inter_op_num_threads": 0})"), number + ", the machine's cores, as \"inter_op_num_threads\""},
        {options(R"({"intra_op_num_threads": 1, "intra_op_num_threads": 0})"), number},
        {entry(threads("100000")), number},
        {entry(threads(std::to_string(std::max(std::thread::hardware_concurrency(), 1U) + 1))), number},
        {entry(threads("-1")), number},
        {entry(threads("1.0")), number},
        {entry(threads("\"1\"")), number},
        {entry(threads("4294967297")), number},
        {entry("{}"), "is no object of \"session_options\" alone"},
        {entry("[" + one + "]"), "is no object of \"session_options\" alone"},
        {options("1"), "is no object of \"session_options\" alone"},
        {entry(R"({"run_options": {}})"), "is no object of \"session_options\" alone"},
        {entry(R"({"session_options": {}, "session_options": {"enable_profiling": 1}})"), "is no object of"},
        {entry(""), "is no JSON"},
        {entry("{\"session_options\": "), "is no JSON: line 1, column"},
        {entry(one + std::string(1, '\0')), "is no JSON"},
        {options("{\"\xff\": 1}"), "is no JSON"},
        {entry(std::string(500, '[')), "is no JSON"},
        {entry(one + std::string(512, ' ')), "is longer than 512 bytes"},
        {entry(std::string(std::size_t{1} << 20U, '[')), "is longer than 512 bytes"},
        {entry(one) + entry(one), "is there more than once"},
        {part(entryTag, part(keyTag, "x") + part(keyTag, "ort_config") + part(valueTag, one)),
         "not one key and one value"},
        {part(entryTag, part(keyTag, "ort_config") + part(keyTag, "x")), "not one key and one value"},
        {part(entryTag, part(keyTag, "ort_config")), "not one key and one value"},
        // field numbers that begin anew beyond 32 bits for the runtime, which would read the entry
        {part("\xf2\x80\x80\x80\x10", part(keyTag, "ort_config") + part(valueTag, one)), "a field in it has no number"},
        {entry(one).substr(0, 20), "it ends in the middle of a part"},
        {part(entryTag, part(keyTag, "ort_config").substr(0, 5)), "it ends in the middle of a part"}};
    const TestFolder folder;
    for (const char* variable : {static_cast<const char*>(nullptr), "0", "1"}) {
        setOptionsVariable(variable); // the same whether or not the runtime would read it
        for (const auto& [bytes, reason] : cases)
            expectNoSession(folder.write("model.onnx", networkWith(bytes)), LoadResult::Loaded, reason);
    }
    setOptionsVariable(nullptr);
}

TEST(ModelSessionLoad, ANetworkRunsOnAsManyThreadsAsItSays) {
    const TestFolder folder;
    std::list<ModelSession> sessions; // all stay: threads that end are counted for a while
    const auto startedBy = [&](const std::string& more, const char* variable) {
        setOptionsVariable(variable);
        const std::ptrdiff_t before = threadsOfProcess();
        EXPECT_EQ(sessions.emplace_back().load(folder.write("model.onnx", networkWith(more)), true),
                  LoadResult::Loaded);
        EXPECT_THAT(sessions.back().run(std::vector<float>(7)), SizeIs(6)) << sessions.back().errorText();
        return threadsOfProcess() - before;
    };
    const int most = std::thread::hardware_concurrency() > 1 ? 2 : 1;
    startedBy(entry(threads(std::to_string(most))), "1"); // with what the runtime and a sanitizer start once, if at all
    const std::ptrdiff_t usual = startedBy("", nullptr);
    const std::string foreign = part(entryTag, part(keyTag, "ort_config ") + part(valueTag, "{")); // another key
    for (const char* variable : {static_cast<const char*>(nullptr), "", "0", "1"}) {
        const bool isRead = variable != nullptr && *variable == '1';
        EXPECT_EQ(startedBy(foreign, variable), usual);
        for (int count = 1; count <= most; ++count)
            EXPECT_EQ(startedBy(entry(threads(std::to_string(count))), variable), isRead ? count - 1 : usual);
    }
    for (const char* variable : {"yes", "2", "01", " 1"}) {
        setOptionsVariable(variable);
        ModelSession session;
        StdoutCapture out;
        session.load(testModel("direct"), true);
        EXPECT_EQ(session.errorText(), "the environment variable ORT_LOAD_CONFIG_FROM_MODEL is \"" +
                                           std::string(variable) + "\", and may only be 0 or 1");
    }
    setOptionsVariable(nullptr);
}

TEST(ModelSessionLoad, OnlyRegularFilesReachTheRuntime) {
    const TestFolder folder;
    fs::create_directory(folder / "folder.onnx");
    ASSERT_EQ(mkfifo((folder / "pipe.onnx").c_str(), 0600), 0);
    expectNoSession(folder / "folder.onnx", LoadResult::Loaded, "not a regular file");
    expectNoSession(folder / "pipe.onnx", LoadResult::Loaded, "not a regular file"); // and does not hang
    fs::create_symlink(testModel("direct"), folder / "link.onnx");
    ModelSession session;
    session.load(folder / "link.onnx", true);
    EXPECT_TRUE(session.isLoaded());
}

TEST(ModelSessionLoad, EqualPathIsLoadedAgainOnlyByForce) {
    const TestFolder folder;
    const fs::path path = folder / "model.onnx";
    ModelSession session;
    EXPECT_EQ(session.load(path, false), LoadResult::NotFound);
    copyModel(path);
    EXPECT_EQ(session.load(path, false), LoadResult::NotFound);
    EXPECT_EQ(session.load(path, true), LoadResult::Loaded);
    folder.write("model.onnx", "damaged");
    EXPECT_EQ(session.load(path, false), LoadResult::Loaded);
    EXPECT_THAT(session.run(std::vector<float>(7)), SizeIs(6));
    EXPECT_EQ(session.load(folder / "./model.onnx", false), LoadResult::Loaded); // another path: not the same text
    EXPECT_FALSE(session.isLoaded());
    EXPECT_EQ(ModelSession().load("", false), LoadResult::NotLoaded); // equal to the path of a fresh session
}

TEST(ModelSessionLoad, SuccessReplacesAnyState) {
    ModelSession session;
    session.load(testModel("bad_text"), true);
    EXPECT_EQ(session.load(testModel("direct"), true), LoadResult::Loaded);
    EXPECT_EQ(session.errorText(), "");
    EXPECT_EQ(session.inputCount(), 7);
    EXPECT_EQ(session.load(testModel("coefficients"), false), LoadResult::Loaded);
    EXPECT_EQ(session.inputCount(), 2);
    EXPECT_THAT(session.run(std::vector<float>(2)), SizeIs(1));
}

TEST(ModelSessionLoad, ResetKeepsTypeAndShapes) {
    ModelSession session;
    session.load(testModel("direct"), true);
    session.reset();
    EXPECT_EQ(session.lastResult(), LoadResult::NotLoaded);
    EXPECT_EQ(session.type(), ModelType::OnnxType);
    EXPECT_EQ(session.inputCount(), 7);
    EXPECT_FALSE(session.isLoaded());
    EXPECT_THAT(session.run(std::vector<float>(7)), IsEmpty());
    EXPECT_EQ(session.load(testModel("direct"), false), LoadResult::NotLoaded); // the path is still the same
}

TEST(ModelSessionLoad, PathsAreBytes) {
    const TestFolder folder;
    for (const char* name : {".onnx", "with space.onnx", "\xc3\xa9\xe6\x89\x8b \xf0\x9f\x96\x90.onnx",
                             "\xff\xfe not UTF-8.onnx", "%s%n.onnx"}) {
        copyModel(folder / name);
        ModelSession session;
        EXPECT_EQ(session.load(folder / name, true), LoadResult::Loaded) << name;
        EXPECT_THAT(session.run(std::vector<float>(7)), SizeIs(6)) << name;
        expectNoSession(folder.write(name, "damaged"), LoadResult::Loaded, "");
    }
}
