// SPDX-License-Identifier: Apache-2.0
// What packing costs is what it says.
#include "quarn/view/packing.h"

#include <gmock/gmock.h>

#include <cmath>
#include <random>

namespace {

using namespace quarn;

std::vector<float> someNumbers(std::size_t count, double size) {
    std::minstd_rand dice(5);
    std::normal_distribution<double> normal(0.0, size);
    std::vector<float> numbers(count);
    for (float& number : numbers)
        number = static_cast<float>(normal(dice));
    return numbers;
}

TEST(Packing, ABasisIsOffByHalfAScaleAtMost) {
    constexpr std::size_t shapes = 7, slots = 31;
    std::vector<float> values = someNumbers(slots * shapes * 3, 0.01);
    for (std::size_t i = 0; i < values.size(); ++i) // shapes of all sizes; the last is nothing
        values[i] *= static_cast<float>(i / 3 % shapes == shapes - 1 ? 0.0 : std::pow(10.0, -double(i / 3 % shapes)));
    EXPECT_EQ(packBasis(values, shapes, BasisKind::f32).floats, values);
    for (const BasisKind kind : {BasisKind::i16, BasisKind::i8}) {
        const PackedBasis packed = packBasis(values, shapes, kind);
        ASSERT_EQ(packed.scales.size(), shapes);
        for (std::size_t i = 0; i < values.size(); ++i) {
            const float scale = packed.scales[i / 3 % shapes];
            const float number = kind == BasisKind::i16 ? packed.shorts[i] : packed.bytes[i];
            EXPECT_EQ(packed.floats[i], scale * number);
            EXPECT_LE(std::abs(packed.floats[i] - values[i]), 0.5001F * scale) << i;
        }
    }
}

TEST(Packing, ThePackingErrorIsTheLargestOfAnyDeltaInAnyFrame) {
    // two slots of two shapes, the second of which is off along two axes
    const std::vector<float> values(12, 1.0F);
    std::vector<float> packed = values;
    packed[9] += 0.25F;
    packed[10] -= 0.25F;
    const std::vector<float> coefficients = {5.0F, 0.0F, 7.0F, -4.0F, 1.0F, 2.0F};
    EXPECT_NEAR(packingError(values, packed, 2, coefficients), std::sqrt(2.0), 1e-12);
    EXPECT_EQ(packingError(values, values, 2, coefficients), 0.0);
}

TEST(Packing, PointsComeBackWithinTheErrorThatIsSaid) {
    std::vector<float> xyz = someNumbers(300, 3.0);
    for (std::size_t i = 2; i < xyz.size(); i += 3)
        xyz[i] = 4.0F; // flat
    const PackedPoints packed = packPoints(xyz);
    double largest = 0.0;
    for (std::size_t i = 0; i < xyz.size(); i += 3) {
        double squares = 0.0;
        for (std::size_t axis = 0; axis < 3; ++axis) {
            const double back =
                packed.box[axis] + packed.box[3 + axis] * (packed.numbers[i + axis] + 32768.0) / 65535.0;
            squares += std::pow(back - static_cast<double>(xyz[i + axis]), 2);
        }
        largest = std::max(largest, std::sqrt(squares));
    }
    EXPECT_LE(largest, packed.error);
    EXPECT_GE(largest, 0.5 * packed.error);
    EXPECT_EQ(packed.box[5], 0.0);
}

TEST(Packing, DistancesAreRoundedWithinTheRange) {
    EXPECT_THAT(packDistances(std::vector{0.0F, 0.49F, 0.51F, 255.0F}, 255.0), testing::ElementsAre(0, 0, 1, 255));
    EXPECT_THAT(packDistances(std::vector{0.0F}, 0.0), testing::ElementsAre(0));
}

} // namespace
