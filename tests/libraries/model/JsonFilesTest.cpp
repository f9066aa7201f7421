// SPDX-License-Identifier: Apache-2.0
// What both readers of the model directory do with files that are no usable JSON document.
#include <functional>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "support.h"

using namespace neuralWarp;

namespace {

constexpr const char* cannotOpen = "Failed to open metadata file stream\n";
constexpr const char* parseError = "Parse error\n";

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
    for (const std::string& text :
         std::vector<std::string>{"", "{} x", "{}{}", "{\"a\": NaN}", "{\"a\": Infinity}", "{\"a\": 1e400}", "{'a': 1}",
                                  "{\"a\": 1,}", "{/**/}", "{\"a\": \"", zero, "{\"a\": \"" + zero + "\"}", "{}" + zero,
                                  "{} " + zero + "{}", "\xef\xbb\xbf{}", "\xff\xfe{"}) {
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
    const std::string lists(depth, '[');
    std::string objects;
    for (std::size_t i = 0; i < depth; ++i) {
        objects += "{\"\":";
    }
    const TestFolder folder;
    expectAccepted(folder.write("file.json", "{\"a\": " + lists + std::string(depth, ']') + "}"));
    expectAccepted(folder.write("file.json", objects + "0" + std::string(depth, '}')));
    expectRefused(folder.write("file.json", lists), parseError);
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
