// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/packing.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace quarn {
namespace {

template <class Number>
std::vector<float> scalesOf(std::span<const float> values, std::size_t shapes) {
    std::vector<float> scales(shapes, 0.0F);
    for (std::size_t i = 0; i < values.size(); ++i)
        scales[i / 3 % shapes] = std::max(scales[i / 3 % shapes], std::abs(values[i]));
    for (float& scale : scales)
        scale /= static_cast<float>(std::numeric_limits<Number>::max());
    return scales;
}

// a scale that has become 0 or as small as numbers are not exact stands for nothing
template <class Number>
Number nearest(float value, float scale) {
    constexpr double most = std::numeric_limits<Number>::max();
    if (scale < std::numeric_limits<float>::min())
        return 0;
    const double number = std::nearbyint(static_cast<double>(value) / static_cast<double>(scale));
    return static_cast<Number>(std::clamp(number, -most, most));
}

template <class Number>
void pack(PackedBasis& basis, std::vector<Number>& numbers, std::size_t shapes) {
    basis.scales = scalesOf<Number>(basis.floats, shapes);
    numbers.resize(basis.floats.size());
    for (std::size_t i = 0; i < numbers.size(); ++i) {
        const float scale = basis.scales[i / 3 % shapes];
        numbers[i] = nearest<Number>(basis.floats[i], scale);
        basis.floats[i] = scale * static_cast<float>(numbers[i]);
    }
}

// how far a delta of one slot moves in one frame; `errors` [shapes][3]
double squaredMove(const double* errors, const float* coefficients, std::size_t shapes) {
    std::array<double, 3> moved{};
    for (std::size_t shape = 0; shape < shapes; ++shape)
        for (std::size_t axis = 0; axis < 3; ++axis)
            moved[axis] += static_cast<double>(coefficients[shape]) * errors[3 * shape + axis];
    return moved[0] * moved[0] + moved[1] * moved[1] + moved[2] * moved[2];
}

} // namespace

PackedBasis packBasis(std::vector<float> values, std::size_t shapes, BasisKind kind) {
    PackedBasis basis;
    basis.kind = kind;
    basis.floats = std::move(values);
    if (kind == BasisKind::i16)
        pack(basis, basis.shorts, shapes);
    if (kind == BasisKind::i8)
        pack(basis, basis.bytes, shapes);
    return basis;
}

double packingError(std::span<const float> values, std::span<const float> packed, std::size_t shapes,
                    std::span<const float> coefficients) {
    double largest = 0.0;
    std::vector<double> errors(3 * shapes);
    for (std::size_t slot = 0; slot + errors.size() <= values.size(); slot += errors.size()) {
        for (std::size_t i = 0; i < errors.size(); ++i)
            errors[i] = static_cast<double>(packed[slot + i]) - static_cast<double>(values[slot + i]);
        for (std::size_t frame = 0; frame + shapes <= coefficients.size(); frame += shapes)
            largest = std::max(largest, squaredMove(errors.data(), coefficients.data() + frame, shapes));
    }
    return std::sqrt(largest);
}

PackedPoints packPoints(std::span<const float> xyz) {
    constexpr double steps = 65535.0;
    PackedPoints packed;
    packed.numbers.resize(xyz.size());
    double squares = 0.0;
    for (std::size_t axis = 0; axis < 3 && axis < xyz.size(); ++axis) {
        double least = static_cast<double>(xyz[axis]), most = least;
        for (std::size_t i = axis; i < xyz.size(); i += 3) {
            least = std::min(least, static_cast<double>(xyz[i]));
            most = std::max(most, static_cast<double>(xyz[i]));
        }
        const double extent = most - least;
        packed.box[axis] = least;
        packed.box[3 + axis] = extent;
        squares += extent * extent;
        for (std::size_t i = axis; i < xyz.size(); i += 3) {
            const double part = extent == 0.0 ? 0.0 : (static_cast<double>(xyz[i]) - least) / extent;
            packed.numbers[i] = static_cast<std::int16_t>(std::nearbyint(part * steps) - 32768.0);
        }
    }
    packed.error = 0.5 * std::sqrt(squares) / steps;
    return packed;
}

std::vector<std::uint8_t> packDistances(std::span<const float> distances, double range) {
    std::vector<std::uint8_t> numbers(distances.size());
    std::transform(distances.begin(), distances.end(), numbers.begin(), [&](float distance) {
        const double part = range == 0.0 ? 0.0 : std::min(static_cast<double>(distance) / range, 1.0);
        return static_cast<std::uint8_t>(std::nearbyint(255.0 * part));
    });
    return numbers;
}

} // namespace quarn
