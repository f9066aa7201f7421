// SPDX-License-Identifier: Apache-2.0
// The body of every kernel of smoothing in rows, over a type of lanes that holds four padded points. Included by one
// file per instruction set, each compiled for its own: everything here has internal linkage and no inline function of
// another header is called, so that no code of a larger instruction set can stand in for that of a smaller one.
#pragma once

#include "rows.h"

namespace quill {
namespace {

// Lanes offers zero(), gather(rows, indices) and load(row) of four points, spread(p) of four numbers, each over a
// point, add, multiply, divide, store, and where(counts, k, yes, no): `yes` in points whose count is above k.
template <typename Lanes>
void smoothRows(const RowQuad* quads, const NeighbourQuad* neighbours, const PaddedPoint* source,
                PaddedPoint* destination, std::size_t begin, std::size_t end) {
    // array members are read by pointer: operator[] is an inline function of another header
    const auto* const from = reinterpret_cast<const float*>(source);
    auto* const to = reinterpret_cast<float*>(destination);
    for (std::size_t q = begin; q < end; ++q) {
        const RowQuad& quad = quads[q];
        const auto* const counts = reinterpret_cast<const float*>(&quad.count);
        const NeighbourQuad* neighbour = neighbours + quad.firstQuad;
        auto sum = Lanes::zero();
        const auto plusNext = [&] {
            const auto next =
                Lanes::multiply(Lanes::gather(from, reinterpret_cast<const std::uint32_t*>(&neighbour->vertex)),
                                Lanes::spread(reinterpret_cast<const float*>(&neighbour->weight)));
            ++neighbour;
            return Lanes::add(sum, next);
        };
        for (std::uint32_t k = 0; k < quad.fewest; ++k)
            sum = plusNext();
        for (std::uint32_t k = quad.fewest; k < quad.most; ++k)
            sum = Lanes::where(counts, static_cast<float>(k), plusNext(), sum);
        auto result = Lanes::divide(sum, Lanes::spread(counts));
        if (quad.fewest == 0)
            result = Lanes::where(counts, 0.0F, result, Lanes::load(from + 16 * q));
        Lanes::store(to + 16 * q, result);
    }
}

} // namespace
} // namespace quill
