// SPDX-License-Identifier: Apache-2.0
// What is promised for the moment when memory runs out: this program's operator new refuses what is large.
#include <cstdint>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "nw_model/ModelMetadata.h"
#include "nw_model/ModelSession.h"
#include "nw_model/PrincipalShapes.h"
#include "support.h"
#include "support/limitedNew.h"

using namespace neuralWarp;
using testing::IsEmpty;

namespace {

constexpr std::size_t count = 3000;

/// Refuses arrays of `count` four-byte elements, and larger ones, while it lives.
struct NoLargeArrays {
    NoLargeArrays() { refusedAllocation = count * 4; }
    ~NoLargeArrays() { refusedAllocation = SIZE_MAX; }
};

std::string numbers() {
    std::string text = "[1";
    for (std::size_t i = 1; i < count; ++i) {
        text += ",1";
    }
    return text + "]";
}

} // namespace

TEST(NoMemory, RunGivesAnEmptyResult) {
    ModelSession session;
    session.load(testModel("wide"), true);
    const std::vector<float> inputs = {1};
    {
        const NoLargeArrays limit;
        EXPECT_THAT(session.run(inputs), IsEmpty());
    }
    EXPECT_EQ(session.errorText(), "std::bad_alloc");
    EXPECT_EQ(session.run(inputs).size(), count);
}

TEST(NoMemory, MetadataRecordIsUnchanged) {
    const TestFolder folder;
    const auto path = folder.write("metadata.json", R"({"fullCount": 1, "affectMap": )" + numbers() + "}");
    ModelMetadata record;
    StdoutCapture out;
    {
        const NoLargeArrays limit;
        EXPECT_FALSE(readMetadataFile(record, path));
    }
    EXPECT_EQ(out.take(), "Error: " + path.string() + ": out of memory\n");
    EXPECT_FALSE(record.loaded);
    EXPECT_EQ(record.fullCount, 0u);
    EXPECT_TRUE(readMetadataFile(record, path));
}

TEST(NoMemory, PrincipalShapesAreEmpty) {
    const TestFolder folder;
    const auto path = folder.write("principal_shapes.json",
                                   R"({"principalShapeCount": 1, "principalVertCount": 1000, "principalShapes": [)" +
                                       numbers() + "]}");
    std::vector<float> values = {1};
    std::uint64_t shapeCount = 9;
    std::uint64_t vertCount = 9;
    StdoutCapture out;
    {
        const NoLargeArrays limit;
        EXPECT_FALSE(readPrincipalShapesFile(path, values, shapeCount, vertCount));
    }
    EXPECT_EQ(out.take(), "Error: " + path.string() + ": out of memory\n");
    EXPECT_THAT(values, IsEmpty());
    EXPECT_EQ(shapeCount + vertCount, 0u);
    EXPECT_TRUE(readPrincipalShapesFile(path, values, shapeCount, vertCount));
}
