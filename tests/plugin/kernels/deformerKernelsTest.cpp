// SPDX-License-Identifier: Apache-2.0
// What whole scenes cannot show, whose frames the parity tests compare: kernels that read or write beside their
// buffers, and slots that the deltas do not reach.
#include "KernelTest.h"
#include "frame/deltas.h"

#include "quill/IndexMapper.h"

namespace {

using DeformerKernels = KernelTest;

TEST_F(DeformerKernels, PrincipalShapesGiveTheBitsOfTheProcessor) {
    const kernels::Program program(*device(), "neuralWarpGPUNode.cl", true);
    Dice dice(4);
    for (const std::size_t slots : oddSizes)
        for (const std::size_t shapes : {1U, 51U}) {
            const auto basis = dice.floats(3 * slots * shapes, 2.0);
            const auto coefficients = dice.floats(shapes, 2.0);
            Points expected;
            neuralWarp::PrincipalBasis sums;
            sums.assign(basis, shapes);
            neuralWarp::extractPrincipalDeltas(expected, coefficients, sums, neuralWarp::DrivenVertices(slots), {},
                                               expected);
            Launch launch(program, "gpu_principal_shapes_kernel");
            launch.output(Points(slots)).input(coefficients).input(basis);
            launch.value(static_cast<std::uint32_t>(shapes)).value(static_cast<std::uint32_t>(slots));
            EXPECT_TRUE(same(launch.run(slots), expected)) << slots << " slots, " << shapes << " shapes";
        }
}

// offsets of a shuffled part of the geometry; of the slots some are missing and some are beyond the deltas
TEST_F(DeformerKernels, ApplyMovesWhatHasASlotAndWritesNothingElse) {
    const kernels::Program program(*device(), "neuralWarpGPUNode.cl", true);
    Dice dice(5);
    for (const std::size_t n : oddSizes) {
        const Points input = randomPoints(dice, n + 9), target = randomPoints(dice, n + 9),
                     current = randomPoints(dice, n);
        const Points deltas = randomPoints(dice, n - n / 5), before = randomPoints(dice, n + 9);
        const auto weights = dice.floats(n, 2.0);
        const Indices map = dice.chosen(n, n + 9);
        Indices slots = dice.chosen(n, n);
        for (std::size_t i = 0; i < n; i += 3)
            slots[i] = quill::missingIndex;
        Points expected = before;
        for (std::size_t i = 0; i < n; ++i) {
            const auto p = input[map[i]];
            auto c = slots[i] < deltas.size() ? current[i] + deltas[slots[i]] : p;
            c = c + (target[map[i]] - c) * 0.25F;
            expected[map[i]] = p + weights[i] * 0.75F * (c - p);
        }
        Launch launch(program, "gpu_apply_deltas_kernel");
        launch.output(before).input(input).input(current).input(weights).input(map).value(0.75F).input(deltas);
        launch.input(slots).value(static_cast<std::uint32_t>(deltas.size()));
        launch.absent<std::uint32_t>().absent<std::uint32_t>().absent<float>().absent<double>();
        launch.input(target).value(0.25F).value(static_cast<std::uint32_t>(n));
        EXPECT_TRUE(same(launch.run(n), expected)) << n;
    }
}

} // namespace
