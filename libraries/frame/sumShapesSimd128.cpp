// SPDX-License-Identifier: Apache-2.0
// Compiled for WebAssembly's vectors of 128 bits: the 48 sums of a block are twelve of them.
#include "sumShapes.h"

#include <wasm_simd128.h>

namespace neuralWarp {

void sumShapesSimd128(float* sums, const float* block, const float* coefficients, std::size_t shapes) {
    constexpr std::size_t vectors = 12;
    v128_t sum[vectors]; // NOLINT(modernize-avoid-c-arrays): stays in registers
    for (v128_t& s : sum)
        s = wasm_f32x4_splat(0.0F);
    for (std::size_t j = 0; j < shapes; ++j, block += 4 * vectors) {
        const v128_t coefficient = wasm_f32x4_splat(coefficients[j]);
#pragma GCC unroll 12
        for (std::size_t i = 0; i < vectors; ++i)
            sum[i] = wasm_f32x4_add(sum[i], wasm_f32x4_mul(coefficient, wasm_v128_load(block + 4 * i)));
    }
#pragma GCC unroll 12
    for (std::size_t i = 0; i < vectors; ++i)
        wasm_v128_store(sums + 4 * i, sum[i]);
}

} // namespace neuralWarp
