// SPDX-License-Identifier: Apache-2.0
#include "nw_model/PrincipalShapes.h"

#include <regex>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "support.h"

using namespace neuralWarp;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

struct Shapes {
    bool ok = false;
    std::vector<float> values = {9, 9}; // outputs hold what an earlier model left
    std::uint64_t shapeCount = 9;
    std::uint64_t vertCount = 9;
    std::string output;
};

Shapes read(const std::string& text) {
    const TestFolder folder;
    const auto path = folder.write("principal_shapes.json", text);
    Shapes shapes;
    StdoutCapture out;
    shapes.ok = readPrincipalShapesFile(path, shapes.values, shapes.shapeCount, shapes.vertCount);
    shapes.output = std::regex_replace(out.take(), std::regex(path.string()), "PATH");
    return shapes;
}

std::string withShapes(const std::string& shapes, int shapeCount = 1, int vertCount = 1) {
    return R"({"principalShapes": )" + shapes + R"(, "principalShapeCount": )" + std::to_string(shapeCount) +
           R"(, "principalVertCount": )" + std::to_string(vertCount) + "}";
}

constexpr const char* countMismatch = "Error: principalShapeCount does not match the number of principal shapes\n";

} // namespace

TEST(PrincipalShapes, AreStoredByVertexThenShape) {
    const Shapes shapes = read(withShapes("[[1, 2, 3, 4, 5, 6], [7.5, -8, 9e-1, 10, 11, 0.1]]", 2, 2));
    EXPECT_TRUE(shapes.ok);
    EXPECT_EQ(shapes.output, "");
    EXPECT_EQ(shapes.shapeCount, 2u);
    EXPECT_EQ(shapes.vertCount, 2u);
    EXPECT_THAT(shapes.values, ElementsAre(1.f, 2.f, 3.f, 7.5f, -8.f, 0.9f, 4.f, 5.f, 6.f, 10.f, 11.f, 0.1f));
}

TEST(PrincipalShapes, NumbersAreRoundedToFloat) {
    const Shapes shapes =
        read(withShapes("[[16777217, 18446744073709551616, 3.4028235677973362e38, 1e-60, -0, -5]]", 1, 2));
    EXPECT_THAT(shapes.values, ElementsAre(16777216.f, 0x1p64f, 0x1.fffffep127f, 0.f, 0.f, -5.f));
}

TEST(PrincipalShapes, VertCountStandsInForAMissingOrZeroPrincipalVertCount) {
    for (const std::string first : {"", R"("principalVertCount": 0,)", R"("principalVertCount": -3,)"}) {
        const Shapes shapes = read("{" + first + R"("vertCount": 1, "principalShapeCount": 1,
            "principalShapes": [[1, 2, 3]]})");
        EXPECT_TRUE(shapes.ok) << first;
        EXPECT_EQ(shapes.vertCount, 1u) << first;
        EXPECT_THAT(shapes.values, ElementsAre(1.f, 2.f, 3.f)) << first;
    }
    EXPECT_EQ(read(R"({"principalVertCount": 5, "vertCount": 100})").vertCount, 5u);
}

TEST(PrincipalShapes, NoShapesOrNoVerticesIsNothingToLoad) {
    const Shapes noShapes = read(withShapes("3", 0, 5));
    EXPECT_TRUE(noShapes.ok);
    EXPECT_EQ(noShapes.shapeCount, 0u);
    EXPECT_EQ(noShapes.vertCount, 5u);
    EXPECT_THAT(noShapes.values, IsEmpty());
    const Shapes noVertices = read(withShapes("[[1]]", 2, 0));
    EXPECT_TRUE(noVertices.ok);
    EXPECT_EQ(noVertices.shapeCount, 2u);
    EXPECT_EQ(noVertices.vertCount, 0u);
    EXPECT_THAT(noVertices.values, IsEmpty());
}

TEST(PrincipalShapes, ExtraNumbersOfAShapeAreIgnored) {
    EXPECT_THAT(read(withShapes("[[1, 2, 3, 4]]")).values, ElementsAre(1.f, 2.f, 3.f));
}

TEST(PrincipalShapes, RefusedShapesLeaveNoShapesButTheVertexCount) {
    const auto shape = [](const std::string& reason) { return "Error: PATH: shape " + reason + "\n"; };
    const std::string noFloat = " has no number that a float can hold at place ";
    const std::vector<std::pair<std::string, std::string>> cases = {
        {withShapes("[[1, 2, 3], [4, 5, 6], [7, 8, 9]]", 2), countMismatch},
        {withShapes("{}"), countMismatch},
        {R"({"principalShapeCount": 4294967295, "principalVertCount": 1})", countMismatch},
        {withShapes("[[1, 2], 3]"), countMismatch}, // the number of shapes is checked before the shapes
        {R"({"principalShapeCount": 1, "principalShapes": [], "principalVertCount": 1, "principalShapes": [[1, 2, 3]]})",
         countMismatch},
        {withShapes("[[1, 2]]"), shape("0 has 2 numbers, and 3 are needed")},
        {withShapes("[[1, 2, 3], [1, 2]]", 2), shape("1 has 2 numbers, and 3 are needed")},
        {withShapes("[[1, true, 3]]"), shape("0" + noFloat + "1")},
        {withShapes("[[1, 2, 3, \"4\"]]"), shape("0" + noFloat + "3")},
        {withShapes("[[[1, 2, 3]]]"), shape("0 has 1 numbers, and 3 are needed")},
        {withShapes("[7]"), shape("0 is no array")},
        {withShapes("[{\"0\": 1}]"), shape("0 is no array")},
        {withShapes("[[1e39, 2, 3]]"), shape("0" + noFloat + "0")},
        {withShapes("[[1, 2, -3.4028235677973367e38]]"), shape("0" + noFloat + "2")}, // rounds to minus infinity
    };
    for (const auto& [text, output] : cases) {
        const Shapes shapes = read(text);
        EXPECT_FALSE(shapes.ok) << text;
        EXPECT_EQ(shapes.output, output) << text;
        EXPECT_EQ(shapes.shapeCount, 0u) << text;
        EXPECT_EQ(shapes.vertCount, 1u) << text;
        EXPECT_THAT(shapes.values, IsEmpty()) << text;
    }
}

TEST(PrincipalShapes, HugeCountsAllocateNothing) {
    // 3 * 2 * 4294967295 floats would be 96 GiB, and 3 * 4294967295 does not fit 32 bits
    const Shapes shapes = read(R"({"principalShapeCount": 2, "principalVertCount": 4294967295,
        "principalShapes": [[1, 2, 3], [1, 2, 3]]})");
    EXPECT_FALSE(shapes.ok);
    EXPECT_EQ(shapes.values.capacity(), 0u);
    EXPECT_EQ(shapes.vertCount, 4294967295u);
}
