// SPDX-License-Identifier: Apache-2.0
#include "frame/deltas.h"

#include "quill/parallelFor.h"

#include <algorithm>
#include <array>

#ifdef __SSE2__
#include <emmintrin.h>
#endif

namespace neuralWarp {
namespace {

/// As many vertices at a time as hide the latency of one addition, which the order of summation makes them wait for.
constexpr std::size_t blockSize = 8;

/// How far beyond the present block the basis is asked for, in bytes. A block walks down its rows side by side, and the
/// processor does not see that as the one stream through memory that it is. Found by trial with S = 20, 50 and 100 on
/// bases larger than the cache: 2 to 8 KiB are within a few percent of each other; asking for nothing takes two to four
/// times as long.
constexpr std::size_t prefetchDistance = 4096;

struct Basis {
    const float* row(std::size_t slot) const { return values + 3 * shapeCount * slot; }
    const float* values;
    const float* coefficients;
    std::size_t shapeCount;
};

quill::val3<float> sumOfShapes(const Basis& basis, std::size_t slot) {
    const float* shape = basis.row(slot);
    quill::val3<float> sum;
    for (std::size_t j = 0; j < basis.shapeCount; ++j, shape += 3)
        for (std::size_t axis = 0; axis < 3; ++axis)
            sum[axis] += basis.coefficients[j] * shape[axis];
    return sum;
}

#ifdef __SSE2__

/// Three floats, and nothing beyond them.
__m128 loadThree(const float* p) {
    const __m128 xy = _mm_castpd_ps(_mm_load_sd(reinterpret_cast<const double*>(p))); // NOLINT: any alignment will do
    return _mm_movelh_ps(xy, _mm_load_ss(p + 2));
}

void storeThree(quill::val3<float>& to, __m128 v) {
    alignas(16) std::array<float, 4> lanes;
    _mm_store_ps(lanes.data(), v);
    to = {lanes[0], lanes[1], lanes[2]};
}

/// Asks for a part of what the blocks after this one will read, when their rows follow each other; else for something
/// near it. An address beyond the basis does no harm.
void prefetchStep(const float* blockEnd, std::size_t j) {
    constexpr std::size_t stepBytes = blockSize * 3 * sizeof(float);
    const char* ahead = reinterpret_cast<const char*>(blockEnd) + prefetchDistance + j * stepBytes; // NOLINT
    for (std::size_t line = 0; line < stepBytes; line += 64)
        _mm_prefetch(ahead + line, _MM_HINT_T0);
}

/// The same sums for blockSize driven vertices side by side; the fourth lane holds nothing of use.
void sumBlock(const Basis& basis, const std::array<const float*, blockSize>& rows, quill::val3<float>* deltas) {
    __m128 sums[blockSize]; // NOLINT(modernize-avoid-c-arrays): std::array would drop the attributes of the type
    for (__m128& sum : sums)
        sum = _mm_setzero_ps();
    const std::size_t last = basis.shapeCount - 1;
    for (std::size_t j = 0; j < last; ++j) {
        prefetchStep(rows[0] + 3 * basis.shapeCount * blockSize, j);
        const __m128 coefficient = _mm_set1_ps(basis.coefficients[j]);
        for (std::size_t v = 0; v < blockSize; ++v)
            sums[v] = _mm_add_ps(sums[v], _mm_mul_ps(coefficient, _mm_loadu_ps(rows[v] + 3 * j)));
    }
    const __m128 coefficient = _mm_set1_ps(basis.coefficients[last]);
    for (std::size_t v = 0; v < blockSize; ++v) // four floats could reach beyond the basis here
        storeThree(deltas[v], _mm_add_ps(sums[v], _mm_mul_ps(coefficient, loadThree(rows[v] + 3 * last))));
}

#else

void sumBlock(const Basis& basis, const std::array<const float*, blockSize>& rows, quill::val3<float>* deltas) {
    for (std::size_t v = 0; v < blockSize; ++v)
        deltas[v] = sumOfShapes({rows[v], basis.coefficients, basis.shapeCount}, 0);
}

#endif

} // namespace

void extractComputedDeltas(Points& deltas, const std::vector<float>& outputs, const DrivenVertices& driven) {
    deltas.resize(driven.count);
    quill::parallelFor(driven.count, [&](std::size_t k) {
        const float* output = outputs.data() + 3 * driven.slot(k);
        deltas[k] = {output[0], output[1], output[2]};
    });
}

void extractPrincipalDeltas(Points& deltas, const std::vector<float>& coefficients, std::size_t shapeCount,
                            const std::vector<float>& basisValues, const DrivenVertices& driven) {
    deltas.assign(driven.count, {});
    if (shapeCount == 0)
        return;
    const Basis basis{basisValues.data(), coefficients.data(), shapeCount};
    quill::parallelForRange(driven.count, [&](int begin, int end) {
        auto k = static_cast<std::size_t>(begin);
        const auto stop = static_cast<std::size_t>(end);
        for (; k + blockSize <= stop; k += blockSize) {
            std::array<const float*, blockSize> rows;
            for (std::size_t v = 0; v < blockSize; ++v)
                rows[v] = basis.row(driven.slot(k + v));
            sumBlock(basis, rows, deltas.data() + k);
        }
        for (; k < stop; ++k)
            deltas[k] = sumOfShapes(basis, driven.slot(k));
    });
}

} // namespace neuralWarp
