// SPDX-License-Identifier: Apache-2.0
#include "viewer/Network.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <limits>
#include <random>
#include <span>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "quarn/view/networkProgram.h"
#include "support/failureOf.h"
#include "viewer/activations.h"

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using viewer::Network;
using Words = std::vector<std::uint32_t>;

namespace {

constexpr std::uint32_t none = viewer::noVector;
constexpr float infinity = std::numeric_limits<float>::infinity();

/// 2 controls times a matrix, bounded, and then times itself.
const Words words{1, 4, 2,    3, 3, 3, 2, 3, 3, 3,          // the head, and the lengths
                  1, 0, none, 1, 0, 6, 0, 8, 1, none, 2, 6, // matrix, and clip up to its constants' offset
                  2, 0, 7,    2, 2, 3, 0, 0, 0};
const std::vector<float> constants{1, 2, 3, 10, 20, 30, -infinity, 25};

/// The places of the words that the cases change.
enum Place {
    version = 0,
    vectors = 1,
    outputs = 3,
    output = 5,
    length = 8,
    kind = 10,
    a = 11,
    b = 12,
    result = 13,
    count = 15
};

TEST(Network, ComputesTheWords) {
    Network network(words, constants);
    EXPECT_EQ(network.inputCount(), 2u);
    EXPECT_EQ(network.outputCount(), 3u);
    EXPECT_THAT(network.run(std::vector<float>{-1, 1}), ElementsAre(81, 324, 625));
    EXPECT_THAT(network.run(std::vector<float>{-2, 0, 7}), ElementsAre(4, 16, 36)); // one control more
    EXPECT_THAT(network.run(std::vector<float>{1}), IsEmpty());
    for (const float odd : {infinity, -infinity, std::nanf("")})
        EXPECT_THAT(network.run(std::vector<float>{0, odd}), IsEmpty());
}

TEST(Network, NamesTheOperationThatDoesNotFit) {
    struct Case {
        std::size_t place;
        std::uint32_t word;
        const char* reason;
    };
    const Case cases[] = {
        {version, 2, "version"},
        {vectors, 5, "has 31 words"},
        {vectors, none, "has 31 words"},
        {outputs, 4, "other numbers of controls or outputs"},
        {output, 4, "other numbers of controls or outputs"},
        {length, 0, "a vector without values"},
        {length, 1U << 31U, "more than 134217728 values"},
        {kind, 0, "operation 0, of kind 0, is none that is known"},
        {kind, 14, "operation 0, of kind 14, is none that is known"},
        {kind, 10, "operation 0, of kind 10, takes vectors or constants of other lengths"},
        {a, 1, "operation 0, of kind 1, takes a vector that is not there yet"},
        {b, 0, "operation 0, of kind 1, takes a vector that is not there yet"},
        {result, 0, "operation 0, of kind 1, gives no vector, or one that is there"},
        {result, 4, "operation 0, of kind 1, gives no vector, or one that is there"},
        {count, 9, "operation 0, of kind 1, takes constants that are not there"},
        {count, 5, "operation 0, of kind 1, takes vectors or constants of other lengths"},
        {kind + 7 + 4, 7, "operation 1, of kind 8, takes constants that are not there"},
        {kind + 14 + 2, 0, "operation 2, of kind 7, takes vectors or constants of other lengths"},
        {kind + 14 + 2, none, "operation 2, of kind 7, takes a vector that is not there yet"},
    };
    for (const auto& [place, word, reason] : cases) {
        Words wrong = words;
        wrong[place] = word;
        const std::string said = failureOf([&] { Network(wrong, constants); });
        EXPECT_THAT(said, HasSubstr("\"network.words\"")) << place;
        EXPECT_THAT(said, HasSubstr(reason)) << place;
    }
    for (std::size_t size = 0; size < words.size(); ++size)
        EXPECT_NE(failureOf([&] { Network(std::span(words).first(size), constants); }), "") << size;
}

// the sanitizers see what a word can reach
TEST(Network, AnyWordIsComputedOrRefused) {
    for (std::size_t place = 0; place < words.size(); ++place)
        for (const std::uint32_t word : {0U, 1U, 2U, 3U, 4U, 5U, 6U, 7U, 8U, 9U, 12U, 13U, 100U, none - 1, none}) {
            Words changed = words;
            changed[place] = word;
            try {
                Network network(changed, constants);
                EXPECT_EQ(network.run(std::vector<float>(network.inputCount(), 0.5F)).size(), network.outputCount());
            } catch (const std::runtime_error& error) {
                EXPECT_THAT(error.what(), HasSubstr("network.words"));
            }
        }
}

TEST(Network, ASumHasTheSameBitsInAMatrixOfAnyWidth) {
    std::mt19937 random(1);
    std::normal_distribution<float> normal;
    constexpr std::uint32_t rows = 45, columns = 2100; // neither of them whole in what is computed together
    std::vector<float> matrix(std::size_t{rows} * columns), controls(rows);
    std::generate(matrix.begin(), matrix.end(), [&] { return normal(random); });
    std::generate(controls.begin(), controls.end(), [&] { return normal(random); });
    const auto run = [&](std::uint32_t width, std::span<const float> numbers) {
        return Network(Words{1, 2, rows, width, 1, 1, rows, width, 1, 0, none, 1, 0, rows * width, 0}, numbers)
            .run(controls);
    };
    const std::vector<float> all = run(columns, matrix);
    for (std::size_t column = 0; column < columns; column += 41) {
        std::vector<float> alone;
        double exact = 0.0;
        for (std::size_t row = 0; row < rows; ++row) {
            alone.push_back(matrix[row * columns + column]);
            exact += double{controls[row]} * double{alone.back()};
        }
        EXPECT_EQ(run(1, alone).front(), all[column]) << column;
        EXPECT_NEAR(all[column], exact, 1e-5) << column;
    }
}

TEST(Activations, AreAsNearAsTheyAreSaidToBe) {
    double tanhUnits = 0.0;
    double sigmoidError = 0.0;
    for (std::uint32_t bits = 0; bits < std::bit_cast<std::uint32_t>(infinity); bits += 1013) {
        const auto x = std::bit_cast<float>(bits);
        const double exact = std::tanh(double{x});
        int exponent = 0;
        std::frexp(exact, &exponent);
        const double unit = std::ldexp(1.0, std::max(exponent - 24, -149));
        tanhUnits = std::max(tanhUnits, std::fabs(viewer::hyperbolicTangent(x) - exact) / unit);
        EXPECT_EQ(viewer::hyperbolicTangent(-x), -viewer::hyperbolicTangent(x));
        for (const float side : {x, -x})
            sigmoidError =
                std::max(sigmoidError, std::fabs(viewer::logistic(side) - 1.0 / (1.0 + std::exp(-double{side}))));
    }
    EXPECT_LE(tanhUnits, 1.3);
    EXPECT_LE(sigmoidError, 9e-8);
    EXPECT_EQ(viewer::hyperbolicTangent(-infinity), -1.0F);
    EXPECT_EQ(viewer::logistic(infinity), 1.0F);
    EXPECT_LT(viewer::logistic(-infinity), 1e-21F);
    EXPECT_TRUE(std::isnan(viewer::hyperbolicTangent(std::nanf(""))) && std::isnan(viewer::logistic(std::nanf(""))));
}

TEST(NetworkProgram, OfADamagedFileIsComputedOrRefused) {
    std::ifstream file(std::filesystem::path(NW_TEST_MODELS) / "direct.onnx", std::ios::binary);
    const std::string whole{std::istreambuf_iterator<char>(file), {}};
    int computed = 0;
    for (std::size_t i = 0; i < whole.size(); ++i)
        for (const unsigned flip : {1U, 4U, 16U, 128U}) {
            std::string bytes = whole;
            bytes[i] = static_cast<char>(static_cast<unsigned char>(bytes[i]) ^ flip);
            try {
                std::stringbuf source(bytes);
                const quarn::NetworkProgram program =
                    quarn::networkProgram(neuralWarp::readOnnxGraph(source, bytes.size()));
                Network network(program.words, program.constants);
                computed += network.run(std::vector<float>(network.inputCount())).empty() ? 0 : 1;
            } catch (const std::runtime_error& error) {
                EXPECT_THAT(error.what(), testing::Not(HasSubstr("network.words"))); // what is written can be computed
            }
        }
    EXPECT_GT(computed, 100); // most bytes are numbers
}

} // namespace
