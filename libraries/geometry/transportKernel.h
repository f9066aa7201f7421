// SPDX-License-Identifier: Apache-2.0
// The body of every transport kernel, over a type of lanes that holds eight vertices by component. Included by one file
// per instruction set, each compiled for its own: everything here has internal linkage and no inline function of
// another header is called, so that no code of a larger instruction set can stand in for that of a smaller one.
#pragma once

#include "transport.h"

namespace quill {
namespace {

// Lanes offers two types, Floats and Doubles, of eight numbers each, with
//   load(p), broadcast(s), add, subtract, multiply, reciprocalRoot (1 / sqrt, both rounded), isAbove(a, s), which gives
//   a Mask; moreThan(counts, k), a Mask of the lanes whose count is more than k; select(mask, yes, no); widen, narrow;
//   loadRows(rows, indices, x, y, z) of eight points of four floats each; loadPoints and storePoints of eight packed
//   points
template <typename Lanes>
struct TransportBody {
    using Floats = typename Lanes::Floats;
    using Doubles = typename Lanes::Doubles;

    struct Vectors {
        Floats x, y, z;
    };

    static Vectors minus(const Vectors& a, const Vectors& b) {
        return {Lanes::subtract(a.x, b.x), Lanes::subtract(a.y, b.y), Lanes::subtract(a.z, b.z)};
    }
    static Vectors plus(const Vectors& a, const Vectors& b) {
        return {Lanes::add(a.x, b.x), Lanes::add(a.y, b.y), Lanes::add(a.z, b.z)};
    }
    static Floats minor(Floats a, Floats b, Floats c, Floats d) {
        return Lanes::subtract(Lanes::multiply(a, b), Lanes::multiply(c, d));
    }
    static Vectors cross(const Vectors& a, const Vectors& b) {
        return {minor(a.y, b.z, a.z, b.y), minor(a.z, b.x, a.x, b.z), minor(a.x, b.y, a.y, b.x)};
    }
    template <typename Mask>
    static Vectors select(Mask mask, const Vectors& yes, const Vectors& no) {
        return {Lanes::select(mask, yes.x, no.x), Lanes::select(mask, yes.y, no.y), Lanes::select(mask, yes.z, no.z)};
    }
    static Vectors constant(float x, float y, float z) {
        return {Lanes::broadcast(x), Lanes::broadcast(y), Lanes::broadcast(z)};
    }

    // val3::normalize: where it leaves a vector alone, multiplying by 1 does.
    static Vectors normalized(const Vectors& v) {
        const Floats square =
            Lanes::add(Lanes::add(Lanes::multiply(v.x, v.x), Lanes::multiply(v.y, v.y)), Lanes::multiply(v.z, v.z));
        const Floats factor = Lanes::select(Lanes::isAbove(square, static_cast<float>(1e-20)),
                                            Lanes::reciprocalRoot(square), Lanes::broadcast(1.0F));
        return {Lanes::multiply(v.x, factor), Lanes::multiply(v.y, factor), Lanes::multiply(v.z, factor)};
    }

    static Vectors loadRows(const float* rows, const std::uint32_t* indices) {
        Vectors v;
        Lanes::loadRows(rows, indices, v.x, v.y, v.z);
        return v;
    }

    // x, y and z of the frames' axes, and the points that they stand on.
    struct Frames {
        Vectors x, y, z, origin;
    };

    static Frames measure(const TransportBlock& block, const std::uint32_t* pairs, const float* rows) {
        const Vectors here = loadRows(rows, block.vertex.data());
        Vectors normal = constant(0.0F, 0.0F, 0.0F), tangent = normal;
        for (std::uint32_t k = 0; k < block.most; ++k, pairs += 2 * transportLanes) {
            const Vectors a = minus(loadRows(rows, pairs), here);
            const Vectors sum = plus(normal, cross(a, minus(loadRows(rows, pairs + transportLanes), here)));
            // a lane without this pair keeps its sum: of an infinite vertex the padding adds what is no number
            normal = k < block.fewest ? sum : select(Lanes::moreThan(block.pairCount.data(), k), sum, normal);
            if (k == 0)
                tangent = block.fewest > 0 ? a : select(Lanes::moreThan(block.pairCount.data(), 0), a, tangent);
        }
        normal = normalized(normal);
        const Vectors x = normalized(cross(normal, normalized(tangent)));
        const Frames frames{x, cross(x, normal), normal, here};
        if (block.fewest > 0)
            return frames;
        const auto hasFrame = Lanes::moreThan(block.pairCount.data(), 0);
        return {select(hasFrame, frames.x, constant(1.0F, 0.0F, 0.0F)),
                select(hasFrame, frames.y, constant(0.0F, 1.0F, 0.0F)),
                select(hasFrame, frames.z, constant(0.0F, 0.0F, 1.0F)), here};
    }

    // One component of transformAsPoint: the products with the rows' elements in that column, in double precision.
    static Floats transformed(const Doubles& x, const Doubles& y, const Doubles& z, const Doubles& row0,
                              const Doubles& row1, const Doubles& row2, const Doubles& row3) {
        return Lanes::narrow(Lanes::add(
            Lanes::add(Lanes::add(Lanes::multiply(x, row0), Lanes::multiply(y, row1)), Lanes::multiply(z, row2)),
            row3));
    }

    static Vectors intoRestFrames(const Vectors& points, const double* inverses) {
        const Doubles x = Lanes::widen(points.x), y = Lanes::widen(points.y), z = Lanes::widen(points.z);
        const auto column = [&](std::size_t c) {
            const double* const rows = inverses + 4 * transportLanes * c;
            return transformed(x, y, z, Lanes::load(rows), Lanes::load(rows + transportLanes),
                               Lanes::load(rows + 2 * transportLanes), Lanes::load(rows + 3 * transportLanes));
        };
        return {column(0), column(1), column(2)};
    }

    static Vectors outOfFrames(const Vectors& local, const Frames& frames) {
        const Doubles x = Lanes::widen(local.x), y = Lanes::widen(local.y), z = Lanes::widen(local.z);
        const auto column = [&](Floats Vectors::*c) {
            return transformed(x, y, z, Lanes::widen(frames.x.*c), Lanes::widen(frames.y.*c), Lanes::widen(frames.z.*c),
                               Lanes::widen(frames.origin.*c));
        };
        return {column(&Vectors::x), column(&Vectors::y), column(&Vectors::z)};
    }

    static void run(const TransportTables& tables, const float* rows, const float* deltas, float* out,
                    std::size_t begin, std::size_t end) {
        for (std::size_t b = begin; b < end; ++b) {
            const TransportBlock& block = tables.blocks[b];
            const std::size_t first = transportLanes * b;
            const std::size_t count = tables.listed - first < transportLanes ? tables.listed - first : transportLanes;
            const Frames frames = measure(block, tables.pairs + block.firstPair, rows);
            const float* const rest = tables.rest + 3 * first;
            Vectors delta;
            if (count == transportLanes) {
                Lanes::loadPoints(deltas + 3 * first, delta.x, delta.y, delta.z);
            } else {
                float last[3 * transportLanes] = {}; // NOLINT(modernize-avoid-c-arrays)
                for (std::size_t i = 0; i < 3 * count; ++i)
                    last[i] = deltas[3 * first + i];
                Lanes::loadPoints(last, delta.x, delta.y, delta.z);
            }
            const Vectors moved = plus(
                {Lanes::load(rest), Lanes::load(rest + transportLanes), Lanes::load(rest + 2 * transportLanes)}, delta);
            const Vectors placed = outOfFrames(intoRestFrames(moved, tables.inverses + 12 * first), frames);
            if (tables.isIdentity && count == transportLanes) {
                Lanes::storePoints(out + 3 * first, placed.x, placed.y, placed.z);
                continue;
            }
            float points[3 * transportLanes]; // NOLINT(modernize-avoid-c-arrays)
            Lanes::storePoints(points, placed.x, placed.y, placed.z);
            for (std::size_t j = 0; j < count; ++j)
                for (std::size_t c = 0; c < 3; ++c)
                    out[3 * static_cast<std::size_t>(block.vertex[j]) + c] = points[3 * j + c];
        }
    }
};

template <typename Lanes>
void transport(const TransportTables& tables, const float* rows, const val3<float>* deltas, val3<float>* out,
               std::size_t begin, std::size_t end) {
    // a val3<float> is three packed floats (asserted beside it)
    TransportBody<Lanes>::run(tables, rows, reinterpret_cast<const float*>(deltas), reinterpret_cast<float*>(out),
                              begin, end);
}

} // namespace
} // namespace quill
