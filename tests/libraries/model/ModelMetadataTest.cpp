// SPDX-License-Identifier: Apache-2.0
#include "nw_model/ModelMetadata.h"

#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "support.h"

using namespace neuralWarp;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;

namespace {

/// Reads `text` over a record that an earlier model filled; nothing may be printed.
ModelMetadata read(const std::string& text) {
    const TestFolder folder;
    ModelMetadata record{true, 11, 12, 13, 14, 15, {16, 17}, SubsetState::Partial, "old tags", "old geometry"};
    StdoutCapture out;
    EXPECT_TRUE(readMetadataFile(record, folder.write("metadata.json", text))) << text;
    EXPECT_EQ(out.take(), "") << text;
    EXPECT_TRUE(record.loaded) << text;
    return record;
}

std::vector<std::uint64_t> countsOf(const ModelMetadata& record) {
    return {record.deltaCount, record.deltaMode, record.smoothingIterations, record.affectCount, record.fullCount};
}

constexpr std::uint64_t defaultCounts[] = {0, 1, 0, 0, 0};

} // namespace

TEST(ModelMetadata, ReadsEveryKey) {
    const ModelMetadata record = read(R"({"geometry": "hand", "affectMap": [4, 0, 4294967295], "deltaCount": 1,
        "deltaMode": 0, "smoothingIterations": 3, "affectCount": 4, "fullCount": 4294967295, "unknown": {"deltaMode": 9},
        "subsetState": "partial", "componentTagExpression": "palm\u00e9\n"})");
    EXPECT_THAT(countsOf(record), ElementsAre(1, 0, 3, 4, 4294967295));
    EXPECT_THAT(record.affectMap, ElementsAre(4u, 0u, 4294967295u));
    EXPECT_EQ(record.subsetState, SubsetState::Partial);
    EXPECT_EQ(record.componentTagExpression, "palm\u00e9\n");
    EXPECT_EQ(record.geometry, "hand");
}

TEST(ModelMetadata, EmptyObjectReplacesEveryFieldByItsDefault) {
    const ModelMetadata record = read("{}");
    EXPECT_THAT(countsOf(record), ElementsAreArray(defaultCounts));
    EXPECT_THAT(record.affectMap, IsEmpty());
    EXPECT_EQ(record.subsetState, SubsetState::Unrecognized);
    EXPECT_EQ(record.componentTagExpression, "");
    EXPECT_EQ(record.geometry, "");
}

TEST(ModelMetadata, CountsThatAreNoUnsignedIntegersGiveTheDefault) {
    for (const std::string value :
         {"-1", "1.0", "2e0", "4294967296", "18446744073709551616", "\"2\"", "true", "null", "[2]", "{}", "0.5"}) {
        std::string text = "{";
        for (const char* key : {"deltaCount", "deltaMode", "smoothingIterations", "affectCount", "fullCount"}) {
            text += '"' + std::string(key) + "\": " + value + ',';
        }
        EXPECT_THAT(countsOf(read(text + R"("geometry": ""})")), ElementsAreArray(defaultCounts)) << value;
    }
    EXPECT_EQ(read(R"({"deltaMode": -0})").deltaMode, 0u); // zero with a sign is still an unsigned zero
}

TEST(ModelMetadata, SubsetStateIsExactText) {
    const std::vector<std::pair<std::string, SubsetState>> cases = {
        {R"("empty")", SubsetState::Empty},           {R"("complete")", SubsetState::Complete},
        {R"("partial")", SubsetState::Partial},       {R"("Complete")", SubsetState::Unrecognized},
        {R"("partial ")", SubsetState::Unrecognized}, {R"("partial\u0000")", SubsetState::Unrecognized},
        {R"("")", SubsetState::Unrecognized},         {"3", SubsetState::Unrecognized}};
    for (const auto& [value, state] : cases) {
        EXPECT_EQ(read(R"({"subsetState": )" + value + "}").subsetState, state) << value;
    }
}

TEST(ModelMetadata, OneBadElementEmptiesTheAffectMap) {
    for (const std::string value : {"[0, 5, -2]", "[1.0]", "[4294967296, 1]", "[[1]]", "[true]", "3", "{}", "[]"}) {
        EXPECT_THAT(read(R"({"affectMap": )" + value + "}").affectMap, IsEmpty()) << value;
    }
}

TEST(ModelMetadata, FirstOfRepeatedKeysCounts) {
    const ModelMetadata record = read(R"({"fullCount": 7, "fullCount": 8, "deltaMode": "x", "deltaMode": 0})");
    EXPECT_EQ(record.fullCount, 7u);
    EXPECT_EQ(record.deltaMode, 1u);
}

TEST(ModelMetadata, StringsKeepTheirBytes) {
    EXPECT_EQ(read("{\"geometry\": \"a\xff\xc3(\"}").geometry, "a\xff\xc3("); // not valid UTF-8
    EXPECT_EQ(read(R"({"geometry": "a\u0000b"})").geometry, std::string("a\0b", 3));
}
