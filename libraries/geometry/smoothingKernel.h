// SPDX-License-Identifier: Apache-2.0
// The body of every smoothing kernel, over a type of lanes that holds one point. Included by one file per instruction
// set, each compiled for its own: everything here has internal linkage and no inline function of another header is
// called, so that no code of a larger instruction set can stand in for that of a smaller one.
#pragma once

#include "smoothing.h"

namespace quill {
namespace {

// Lanes offers: load(p), store(p, v) of three floats, which touch nothing beyond them, zero(), and the componentwise
// add, subtract, multiply and divide, the last two by a float.
template <typename Lanes, bool weighted>
struct SmoothingBody {
    // start plus the neighbours first .. last - 1, in that order.
    template <typename Point>
    static Point accumulate(const SmoothingPass& pass, const float* source, Point start, std::uint32_t first,
                            std::uint32_t last) {
        Point sum = start;
#pragma GCC unroll 4
        for (std::uint32_t k = first; k < last; ++k) {
            auto neighbour = Lanes::load(source + 3 * static_cast<std::size_t>(pass.connections[k]));
            if constexpr (weighted)
                neighbour = Lanes::multiply(neighbour, pass.weights[k]);
            sum = Lanes::add(sum, neighbour);
        }
        return sum;
    }

    // The deformer's own case: no mask, the whole step, self not included.
    static void runWhole(const SmoothingPass& pass, const float* source, float* destination, std::size_t begin,
                         std::size_t end) {
        std::uint32_t last = begin < end ? pass.indexer[begin] : 0;
        for (std::size_t i = begin; i < end; ++i) {
            const std::uint32_t first = last;
            last = pass.indexer[i + 1];
            auto result = Lanes::zero();
            if (first != last)
                result = Lanes::divide(accumulate(pass, source, result, first, last),
                                       static_cast<float>(static_cast<std::int32_t>(last - first)));
            else
                result = Lanes::load(source + 3 * i);
            Lanes::store(destination + 3 * i, result);
        }
    }

    static void runAny(const SmoothingPass& pass, const float* source, float* destination, std::size_t begin,
                       std::size_t end) {
        for (std::size_t i = begin; i < end; ++i) {
            const std::uint32_t first = pass.indexer[i];
            const std::uint32_t last = pass.indexer[i + 1];
            const auto here = Lanes::load(source + 3 * i);
            auto result = here;
            if (first != last && (!pass.mask || pass.mask[i] == 0)) {
                const auto sum = accumulate(pass, source, pass.includeSelf ? here : Lanes::zero(), first, last);
                const auto count = static_cast<std::int32_t>(last - first) + (pass.includeSelf ? 1 : 0);
                result = Lanes::divide(sum, static_cast<float>(count));
                if (!pass.wholeStep)
                    result = Lanes::add(here, Lanes::multiply(Lanes::subtract(result, here), pass.step));
            }
            Lanes::store(destination + 3 * i, result);
        }
    }

    static void run(const SmoothingPass& pass, const float* source, float* destination, std::size_t begin,
                    std::size_t end) {
        std::size_t connectedEnd = end < pass.vertexCount ? end : pass.vertexCount;
        if (connectedEnd < begin)
            connectedEnd = begin;
        if (!pass.mask && pass.wholeStep && !pass.includeSelf)
            runWhole(pass, source, destination, begin, connectedEnd);
        else
            runAny(pass, source, destination, begin, connectedEnd);
        for (std::size_t i = connectedEnd; i < end; ++i)
            Lanes::store(destination + 3 * i, Lanes::load(source + 3 * i));
    }
};

template <typename Lanes>
void smooth(const SmoothingPass& pass, const val3<float>* source, val3<float>* destination, std::size_t begin,
            std::size_t end) {
    // a val3<float> is three packed floats (asserted beside it)
    const auto* from = reinterpret_cast<const float*>(source);
    auto* to = reinterpret_cast<float*>(destination);
    if (pass.weights)
        SmoothingBody<Lanes, true>::run(pass, from, to, begin, end);
    else
        SmoothingBody<Lanes, false>::run(pass, from, to, begin, end);
}

} // namespace
} // namespace quill
