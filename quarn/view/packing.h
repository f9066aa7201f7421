// SPDX-License-Identifier: Apache-2.0
// Numbers of a page in fewer bytes, and what that costs.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace quarn {

/// How the principal shapes lie in a page.
enum class BasisKind { f32, i16, i8 };

/// Whole numbers with a scale for each shape: they stand for the floats scale * number, rounded to single precision.
struct PackedBasis {
    BasisKind kind = BasisKind::f32;
    std::vector<float> floats;        ///< [slots][shapes][3]: of f32 the numbers, else what the whole ones stand for
    std::vector<std::int16_t> shorts; ///< the same shape, of i16
    std::vector<std::int8_t> bytes;   ///< of i8
    std::vector<float> scales;        ///< [shapes], of i16 and i8
};

/// `values` [slots][shapes][3], finite; `shapes` above 0. Each number is off by half a scale at most. Thread: any.
PackedBasis packBasis(std::vector<float> values, std::size_t shapes, BasisKind kind);

/// The largest distance that packing moves a delta by, over all slots and frames, in the unit of the values.
///   values, packed  [slots][shapes][3]
///   coefficients    [frames][shapes]
double packingError(std::span<const float> values, std::span<const float> packed, std::size_t shapes,
                    std::span<const float> coefficients);

/// Points in 16 bits an axis, over the box around all of them.
struct PackedPoints {
    std::vector<std::int16_t> numbers; ///< as many as there were coordinates
    std::array<double, 6> box{};       ///< least x, y, z; extent along x, y, z
    double error = 0.0;                ///< the largest distance that a point may have moved
};

/// `xyz` of any number of points, finite: min + extent * (number + 32768) / 65535 is the coordinate again. Thread: any.
PackedPoints packPoints(std::span<const float> xyz);

/// Each distance as number / 255 * range, to the nearest; `range` no smaller than any of them.
std::vector<std::uint8_t> packDistances(std::span<const float> distances, double range);

} // namespace quarn
