// SPDX-License-Identifier: Apache-2.0
#include "rowsKernel.h"

namespace quill {
namespace {

struct PlainLanes {
    struct Four {
        float v[4 * rowLanes]; // NOLINT(modernize-avoid-c-arrays): no inline function of another header
    };
    template <typename Operation>
    static Four each(const Operation& operation) {
        Four result;
        for (std::size_t i = 0; i < 4 * rowLanes; ++i)
            result.v[i] = operation(i);
        return result;
    }
    static Four zero() {
        return each([](std::size_t) { return 0.0F; });
    }
    static Four gather(const float* rows, const std::uint32_t* indices) {
        return each([&](std::size_t i) { return rows[4 * static_cast<std::size_t>(indices[i / 4]) + i % 4]; });
    }
    static Four load(const float* p) {
        return each([&](std::size_t i) { return p[i]; });
    }
    static Four spread(const float* p) {
        return each([&](std::size_t i) { return p[i / 4]; });
    }
    static Four add(const Four& a, const Four& b) {
        return each([&](std::size_t i) { return a.v[i] + b.v[i]; });
    }
    static Four multiply(const Four& a, const Four& b) {
        return each([&](std::size_t i) { return a.v[i] * b.v[i]; });
    }
    static Four divide(const Four& a, const Four& b) {
        return each([&](std::size_t i) { return a.v[i] / b.v[i]; });
    }
    static Four where(const float* counts, float k, const Four& yes, const Four& no) {
        return each([&](std::size_t i) { return counts[i / 4] > k ? yes.v[i] : no.v[i]; });
    }
    static void store(float* p, const Four& a) {
        for (std::size_t i = 0; i < 4 * rowLanes; ++i)
            p[i] = a.v[i];
    }
};

} // namespace

void smoothRowsScalar(const RowQuad* quads, const NeighbourQuad* neighbours, const PaddedPoint* source,
                      PaddedPoint* destination, std::size_t begin, std::size_t end) {
    smoothRows<PlainLanes>(quads, neighbours, source, destination, begin, end);
}

} // namespace quill
