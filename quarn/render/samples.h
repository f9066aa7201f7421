// SPDX-License-Identifier: Apache-2.0
// Where a pixel sends its rays. Nothing here is random: the same pixel always sends the same.
#pragma once

#include "quarn/render/Vec3.h"

#include <cstdint>
#include <numbers>

namespace quarn {

struct Sample2 {
    float u = 0.0F; ///< both 0 to 1
    float v = 0.0F;
};

/// The first two dimensions of the sequence of Sobol', a (0,2)-sequence: every run of 2^k that begins at a multiple of
/// 2^k is spread evenly. Source: T. Kollig and A. Keller, "Efficient Multidimensional Sampling", 2002.
inline Sample2 spreadSample(std::uint32_t index) {
    std::uint32_t first = 0;
    std::uint32_t second = 0;
    std::uint32_t bit = 1U << 31;
    std::uint32_t direction = 1U << 31;
    for (std::uint32_t rest = index; rest != 0; rest >>= 1, bit >>= 1, direction ^= direction >> 1)
        if ((rest & 1U) != 0) {
            first |= bit;
            second ^= direction;
        }
    constexpr float scale = 1.0F / 16777216.0F; // of the upper 24 bits, which a float holds exactly
    return {static_cast<float>(first >> 8) * scale, static_cast<float>(second >> 8) * scale};
}

/// A direction around `axis` (unit length) whose cosine to it is `cosine`.
inline Vec3 directionAround(const Vec3& axis, float cosine, float turn) {
    // T. Duff et al., "Building an Orthonormal Basis, Revisited", 2017
    const float sign = std::copysign(1.0F, axis.z);
    const float a = -1.0F / (sign + axis.z);
    const float b = axis.x * axis.y * a;
    const Vec3 first{1.0F + sign * axis.x * axis.x * a, sign * b, -sign * axis.x};
    const Vec3 second{b, sign + axis.y * axis.y * a, -axis.y};
    const float sine = std::sqrt(1.0F - cosine * cosine);
    const float angle = 2.0F * std::numbers::pi_v<float> * turn;
    return first * (sine * std::cos(angle)) + second * (sine * std::sin(angle)) + axis * cosine;
}

} // namespace quarn
