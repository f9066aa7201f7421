// SPDX-License-Identifier: Apache-2.0
#include "nw_model/OnnxGraph.h"

#include <functional>
#include <iterator>
#include <numeric>
#include <sstream>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "support.h"
#include "support/failureOf.h"

using namespace neuralWarp;
using testing::ElementsAre;
using testing::HasSubstr;

namespace {

OnnxGraph graphOf(const std::string& bytes) {
    std::stringbuf source(bytes);
    return readOnnxGraph(source, bytes.size());
}

/// A field of bytes, and one of a number below 128.
std::string part(int field, const std::string& bytes) {
    std::string size;
    for (std::size_t rest = bytes.size(); rest > 0 || size.empty(); rest >>= 7U)
        size.push_back(static_cast<char>((rest & 127U) | (rest >= 128 ? 128U : 0U)));
    return static_cast<char>(field << 3 | 2) + size + bytes;
}
std::string number(int field, int value) {
    return {static_cast<char>(field << 3), static_cast<char>(value)};
}

// messages of onnx.proto
std::string graph(const std::string& parts) {
    return part(7, parts);
}
std::string value(int field, const std::string& name, const std::vector<int>& shape, int type = 1) {
    std::string dimensions;
    for (const int dimension : shape)
        dimensions += part(1, number(1, dimension));
    return part(field, part(1, name) + part(2, part(1, number(1, type) + part(2, dimensions))));
}
std::string tensor(const std::string& parts) {
    return graph(part(5, part(8, "w") + parts));
}
const std::string ends = graph(value(11, "x", {3}) + value(12, "y", {3}));
const std::string one{"\x00\x00\x80\x3f", 4}, two{"\x00\x00\x00\x40", 4};

TEST(OnnxGraph, HasTheNodesAndNumbersOfAFile) {
    const OnnxGraph read = readOnnxGraph(testModel("direct"));
    ASSERT_EQ(read.nodes.size(), 2u);
    EXPECT_EQ(read.nodes[0].operation, "MatMul");
    EXPECT_THAT(read.nodes[0].inputs, ElementsAre("x", "w"));
    EXPECT_THAT(read.nodes[1].outputs, ElementsAre("y"));
    ASSERT_EQ(read.constants.size(), 2u);
    EXPECT_THAT(read.constants[0].shape, ElementsAre(7u, 6u));
    EXPECT_EQ(read.constants[0].values.at(6 + 2), 2 / 8.0F - 2 / 4.0F); // row 1, column 2
    EXPECT_EQ(read.inputCount, 7u);
    EXPECT_EQ(read.outputCount, 6u);
    EXPECT_EQ(readOnnxGraph(testModel("inferred_output")).outputCount, 0u);
    // the format's first versions have initializers among the inputs
    EXPECT_EQ(graphOf(graph(value(11, "w", {3})) + ends + tensor(number(2, 1) + part(9, one))).input, "x");
    EXPECT_EQ(readOnnxGraph(testModel("matrix_output")).outputCount, 6u);
}

TEST(OnnxGraph, NamesWhatIsWrongOfAFile) {
    const std::pair<const char*, const char*> cases[] = {
        {"bad_empty", "has 0 inputs and not one"},
        {"bad_text", "damaged"},
        {"bad_truncated", "damaged"},
        {"bad_two_inputs", "has 2 inputs and not one"},
        {"bad_input_double", "the input is not float32"},
        {"bad_input_rank2", "the input has not one dimension"},
        {"bad_input_symbolic", "unknown, zero or too large"},
        {"bad_input_huge", "unknown, zero or too large"},
        {"bad_input_low_bits", "unknown, zero or too large"},
        {"bad_no_output", "has no output"},
        {"bad_output_zero", "the output has no values"},
        {"bad_output_overflow", "the output has no values, or more than"},
        {"bad_loop_in_function", "operators of its own"},
        {"no_such_file", "cannot be opened"},
    };
    for (const auto& [name, reason] : cases) {
        const std::string said = failureOf([path = testModel(name)] { readOnnxGraph(path); });
        EXPECT_THAT(said, HasSubstr(reason)) << name;
        EXPECT_EQ(said.rfind(testModel(name).string() + ": ", 0), 0u) << said;
    }
}

TEST(OnnxGraph, KeepsOfAConstantWhyItHasNoNumbers) {
    const std::string shape = number(1, 2), floats = number(2, 1);
    const std::pair<std::string, const char*> cases[] = {
        {shape + floats + part(9, one + two), ""},
        {shape + floats + part(4, one + two), ""},
        {shape + floats + "\x25" + one + "\x25" + two, ""}, // one by one
        {part(1, "\x02") + floats + part(4, one + two), ""},
        {floats + part(9, one), ""}, // a scalar
        {shape + number(2, 7) + part(7, "\x01\x02"), "is of int64 numbers"},
        {shape + number(2, 99) + part(9, one + two), "is of unknown numbers"},
        {shape + floats + part(9, one), "has 1 numbers"},
        {number(1, -1) + "\x7f" + number(1, -1) + "\x7f" + floats + part(9, one), "has 1 numbers"}, // huge together
        {shape + floats + part(9, one + two + "\x01"), "is damaged"},
        {shape + floats + part(9, one) + part(4, two), "is damaged"},
        {shape + floats + number(14, 1), "lies in another file"},
        {shape + floats + part(3, number(1, 0)) + part(9, one + two), "is a part of a larger one"},
    };
    for (const auto& [bytes, flaw] : cases) {
        const OnnxConstant constant = graphOf(ends + tensor(bytes)).constants.at(0);
        EXPECT_THAT(constant.flaw, HasSubstr(flaw));
        EXPECT_EQ(constant.flaw.empty(), *flaw == '\0') << constant.flaw;
        EXPECT_EQ(constant.values.empty(), *flaw != '\0') << flaw;
        if (constant.shape.size() == 1 && constant.flaw.empty()) {
            EXPECT_THAT(constant.values, ElementsAre(1.0F, 2.0F));
        }
    }
    EXPECT_THAT(failureOf([&] { graphOf(ends + graph(part(15, ""))); }), HasSubstr("sparse"));
}

TEST(OnnxGraph, HasLimitsOfItsOwn) {
    // numbers of 4 TB, of which nothing is there
    EXPECT_THAT(failureOf([] { graphOf(ends + tensor("\x4a\xff\xff\xff\xff\xff\x7f")); }), HasSubstr("in the middle"));
    EXPECT_EQ(graphOf(ends + graph(part(1, part(3, std::string(512, 'n'))))).nodes.size(), 1u);
    EXPECT_THAT(failureOf([] { graphOf(ends + graph(part(1, part(3, std::string(513, 'n'))))); }),
                HasSubstr("513 bytes"));
    for (const std::string& little : {part(1, ""), part(1, part(1, "")), part(1, part(5, "")), part(5, number(1, 1))}) {
        std::string many;
        for (std::size_t i = 0; i <= onnxPartLimit; ++i)
            many += little;
        EXPECT_THAT(failureOf([&] { graphOf(ends + graph(many)); }), HasSubstr("100000 parts"));
    }
}

TEST(OnnxGraph, ADamagedFileIsReadOrRefused) {
    for (const char* name : {"direct", "bad_external_in_branch", "constant"}) {
        std::ifstream file(testModel(name), std::ios::binary);
        const std::string whole{std::istreambuf_iterator<char>(file), {}};
        const auto check = [&](const std::string& bytes) {
            try {
                for (const OnnxConstant& constant : graphOf(bytes).constants)
                    EXPECT_TRUE(!constant.flaw.empty() ||
                                constant.values.size() == std::accumulate(constant.shape.begin(), constant.shape.end(),
                                                                          std::size_t{1}, std::multiplies<>()));
            } catch (const std::runtime_error& error) {
                EXPECT_STRNE(error.what(), "");
            }
        };
        for (std::size_t i = 0; i < whole.size(); ++i) {
            check(whole.substr(0, i));
            for (const unsigned flip : {1U, 2U, 8U, 16U, 128U, 255U}) {
                std::string bytes = whole;
                bytes[i] = static_cast<char>(static_cast<unsigned char>(bytes[i]) ^ flip);
                check(bytes);
            }
        }
    }
}

} // namespace
