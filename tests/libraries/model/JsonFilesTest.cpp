// SPDX-License-Identifier: Apache-2.0
// What both readers of the model directory do with files that are no usable JSON document.
#include <functional>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "nw_model/ModelMetadata.h"
#include "nw_model/PrincipalShapes.h"
#include "support.h"

using namespace neuralWarp;

namespace {

constexpr const char* cannotOpen = "Failed to open metadata file stream\n";
constexpr const char* parseError = "Parse error\n";

/// Both readers must fail on `path` with `output`, and leave their outputs as their headers say.
void expectRefused(const std::filesystem::path& path, const std::string& output) {
    ModelMetadata record{true, 11, 12, 13, 14, 15, {16}, SubsetState::Partial, "tags", "geometry"};
    std::vector<float> values(3);
    std::uint64_t shapeCount = 9;
    std::uint64_t vertCount = 9;
    StdoutCapture out;
    EXPECT_FALSE(readMetadataFile(record, path)) << path;
    EXPECT_FALSE(readPrincipalShapesFile(path, values, shapeCount, vertCount)) << path;
    EXPECT_EQ(out.take(), output + output) << path;
    EXPECT_TRUE(record.loaded) << path;
    EXPECT_EQ(record.deltaMode + record.affectMap.size(), 13u) << path;
    EXPECT_EQ(record.geometry, "geometry") << path;
    EXPECT_TRUE(values.empty()) << path;
    EXPECT_EQ(shapeCount + vertCount, 0u) << path;
}

/// Whether both readers accept a file of `text`, which must then be silent.
void expectAccepted(const std::string& text) {
    const TestFolder folder;
    const auto path = folder.write("file.json", text);
    ModelMetadata record;
    std::vector<float> values;
    std::uint64_t counts[2];
    StdoutCapture out;
    EXPECT_TRUE(readMetadataFile(record, path)) << text.substr(0, 80);
    EXPECT_TRUE(readPrincipalShapesFile(path, values, counts[0], counts[1])) << text.substr(0, 80);
    EXPECT_EQ(out.take(), "");
}

} // namespace

TEST(JsonFiles, PathsThatCannotBeOpened) {
    const TestFolder folder;
    const auto link = folder / "loop.json";
    std::filesystem::create_symlink(link, link);
    const auto pipe = folder / "pipe.json";
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    for (const std::filesystem::path& path : std::vector<std::filesystem::path>{
             "", folder / "missing.json", folder / ".", link, pipe, "/dev/zero", folder / std::string(5000, 'x'),
             folder / "\xff\xfe.json", folder.write("file", "{}") / "below.json"}) {
        expectRefused(path, cannotOpen);
    }
}

TEST(JsonFiles, MalformedDocuments) {
    const std::string zero(1, '\0');
    for (const std::string& text : std::vector<std::string>{"",
                                                            "  ",
                                                            "{} x",
                                                            "{}{}",
                                                            "{]",
                                                            "[1,]",
                                                            "{\"a\": NaN}",
                                                            "{\"a\": Infinity}",
                                                            "{\"a\": 1e400}",
                                                            "{\"a\": 01}",
                                                            "{'a': 1}",
                                                            "{\"a\": 1,}",
                                                            "{/**/}",
                                                            "{\"a\": \"\t\"}",
                                                            "{\"a\": \"\\ud800\"}",
                                                            "{\"a\": \"",
                                                            "{\"a\": tru",
                                                            zero,
                                                            "{\"a\": \"" + zero + "\"}",
                                                            "{}" + zero,
                                                            "{}" + zero + "x",
                                                            "{} " + zero + "{}",
                                                            "\xef\xbb\xbf{}",
                                                            "\xff\xfe{"}) {
        const TestFolder folder;
        expectRefused(folder.write("file.json", text), parseError);
    }
}

TEST(JsonFiles, RootsThatAreNoObjects) {
    const TestFolder folder;
    for (const char* text : {"[]", "[{}]", "null", "3", "\"{}\"", "true"}) {
        const auto path = folder.write("file.json", text);
        expectRefused(path, "Error: " + path.string() + ": it holds no JSON object\n");
    }
}

TEST(JsonFiles, NestingIsNotLimited) {
    constexpr std::size_t depth = 1000000;
    expectAccepted("{\"a\": " + std::string(depth, '[') + std::string(depth, ']') + "}");
    std::string objects;
    for (std::size_t i = 0; i < depth; ++i) {
        objects += "{\"\":";
    }
    expectAccepted(objects + "0" + std::string(depth, '}'));
    const TestFolder folder;
    expectRefused(folder.write("file.json", std::string(depth, '[')), parseError);
}

TEST(JsonFiles, SizeLimits) {
    // sparse files of zero bytes: what is read at all gives a parse error at once
    const TestFolder folder;
    const auto path = folder.write("file.json", "");
    ModelMetadata record;
    std::vector<float> values;
    std::uint64_t counts[2];
    const auto readMetadataOf = [&] { return readMetadataFile(record, path); };
    const auto readShapesOf = [&] { return readPrincipalShapesFile(path, values, counts[0], counts[1]); };
    const std::vector<std::pair<std::uint64_t, std::function<bool()>>> readers = {
        {metadataFileLimit, readMetadataOf}, {principalShapesFileLimit, readShapesOf}};
    for (const auto& [limit, reader] : readers) {
        StdoutCapture out;
        std::filesystem::resize_file(path, limit);
        EXPECT_FALSE(reader());
        std::filesystem::resize_file(path, limit + 1);
        EXPECT_FALSE(reader());
        EXPECT_EQ(out.take(), parseError + ("Error: " + path.string() + ": the file is larger than " +
                                            std::to_string(limit) + " bytes\n"));
    }
}
