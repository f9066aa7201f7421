// SPDX-License-Identifier: Apache-2.0
// What would have to be done to the frames of a cache for them to lie on the skin.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace quarn {

using FitPoint = std::array<double, 3>;

/// Each axis of the scene is one of the cache, or its reverse.
struct AxisTurn {
    std::array<int, 3> from{0, 1, 2}; ///< of the scene's x, y and z, which of the cache's
    std::array<int, 3> sign{1, 1, 1}; ///< of the scene's x, y and z: 1 or -1

    bool operator==(const AxisTurn&) const = default;
    bool isNone() const { return *this == AxisTurn{}; }
    bool isMirror() const;
    FitPoint turned(const FitPoint& point) const;
    /// This turn, and the other one after it.
    AxisTurn then(const AxisTurn& other) const;
};

/// Of a cache whose z is up in a scene whose y is, and the reverse; x stays.
inline constexpr AxisTurn fromZUp{{0, 2, 1}, {1, 1, -1}};
inline constexpr AxisTurn fromYUp{{0, 2, 1}, {1, -1, 1}};

/// All parts by their defaults: nothing is changed. Thread: any, as all functions of this folder, one at a time an
/// object.
struct CacheChange {
    std::ptrdiff_t shift = 0; ///< frame f of the skin has frame f + shift of the cache
    AxisTurn axes;
    double scale = 1.0; ///< units of the scene a unit of the cache
    FitPoint offset{};  ///< added after turning and scaling, in units of the scene
    /// Of each vertex of the mesh, the vertex of the cache; empty: the same.
    std::vector<std::uint32_t> order;

    bool isInPlace() const { return axes.isNone() && scale == 1.0 && offset == FitPoint{}; }
    FitPoint moved(const FitPoint& point) const;
    /// x, y, z of the vertex of the mesh in a frame of the cache, moved.
    FitPoint of(std::span<const double> frame, std::size_t vertex) const;
};

/// Root of the sum of squares of the differences.
double fitDistance(const FitPoint& a, const FitPoint& b);

} // namespace quarn
