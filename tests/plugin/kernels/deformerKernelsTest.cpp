// SPDX-License-Identifier: Apache-2.0
#include "KernelTest.h"
#include "frame/deltas.h"
#include "support/meshZoo.h"

#include "quill/VertexFrames.h"

#include <optional>

namespace {

using DeformerKernels = KernelTest;

TEST_F(DeformerKernels, PrincipalShapesGiveTheBitsOfTheProcessor) {
    const kernels::Program program(*device(), "neuralWarpGPUNode.cl", true);
    Numbers numbers(4);
    for (const std::size_t slots : oddSizes)
        for (const std::size_t shapes : {1U, 2U, 50U, 51U}) {
            const auto basis = numbers.floats(3 * slots * shapes);
            const auto coefficients = shapes == 1 ? std::vector<float>{2.0F} : numbers.floats(shapes);
            Points expected;
            neuralWarp::extractPrincipalDeltas(expected, coefficients, shapes, basis,
                                               neuralWarp::DrivenVertices(slots));
            Launch launch(program, "gpu_principal_shapes_kernel");
            launch.output(Points(slots)).input(coefficients).input(basis);
            launch.value(static_cast<std::uint32_t>(shapes)).value(static_cast<std::uint32_t>(slots));
            const Points deltas = launch.run(slots);
            EXPECT_TRUE(same(deltas, expected)) << slots << " slots, " << shapes << " shapes";
            if (shapes == 1) {
                EXPECT_EQ(deltas[0].x, 2.0F * basis[0]);
            }
        }
}

enum class Mode { none, offset, surface };

// Everything that the kernel is told. Absent parts are null buffers.
struct Apply {
    Mode mode = Mode::none;
    float envelope = 1.0F, morphEnvelope = 0.0F;
    Points input, current, rest;
    std::optional<std::vector<float>> weights;
    std::optional<Indices> map, slots;
    std::optional<Points> target;
    Points deltas;
    quill::VertexFrames frames;
    std::vector<quill::mat4d> restFramesInverse;

    std::size_t count() const { return current.size(); }
    std::size_t vertex(std::size_t i) const { return map ? (*map)[i] : i; }

    Points run(const kernels::Program& program, const Points& before) const {
        const auto only = [](bool wanted, const auto& contents) { return wanted ? &contents : nullptr; };
        const auto present = [](const auto& part) { return part ? &*part : nullptr; };
        const bool isSurface = mode == Mode::surface;
        Launch launch(program, "gpu_apply_deltas_kernel");
        launch.output(before).input(input).input(current).input(present(weights)).input(present(map)).value(envelope);
        launch.input(only(mode != Mode::none, deltas)).input(present(slots));
        launch.value(static_cast<std::uint32_t>(deltas.size()));
        launch.input(only(isSurface, frames.framesIndexer())).input(only(isSurface, frames.framesPairs()));
        launch.input(only(isSurface, rest)).input(only(isSurface, restFramesInverse));
        launch.input(present(target)).value(morphEnvelope).value(static_cast<std::uint32_t>(count()));
        return launch.run(count());
    }

    // The model's positions of the driven vertices, by the library.
    Points driven(std::vector<std::uint32_t>& which) const {
        Points perVertex, positions(count());
        for (std::size_t i = 0; mode != Mode::none && i < count(); ++i)
            if (const std::uint32_t m = slots ? (*slots)[i] : static_cast<std::uint32_t>(i); m < deltas.size()) {
                which.push_back(static_cast<std::uint32_t>(i));
                perVertex.push_back(deltas[m]);
                positions[i] = current[i] + deltas[m];
            }
        if (mode == Mode::surface)
            frames.transportDeltas(positions, perVertex, rest, restFramesInverse, current, &which);
        return positions;
    }

    Points expected(Points points) const {
        std::vector<std::uint32_t> which;
        const Points positions = driven(which);
        std::vector<bool> isDriven(count());
        for (const std::uint32_t i : which)
            isDriven[i] = true;
        for (std::size_t i = 0; i < count(); ++i) {
            const std::size_t g = vertex(i);
            const auto p = input[g];
            auto c = isDriven[i] ? positions[i] : p;
            if (target)
                c = c + ((*target)[g] - c) * morphEnvelope;
            points[g] = p + (weights ? (*weights)[i] * envelope : envelope) * (c - p);
        }
        return points;
    }
};

// A strip whose first vertex sees its neighbours in one line and whose last two have none. Some slots are missing, some
// beyond the deltas.
Apply makeApply(Numbers& numbers, std::size_t n, Mode mode, unsigned parts) {
    Apply apply;
    apply.mode = mode;
    apply.envelope = 0.75F;
    apply.morphEnvelope = 0.25F;
    const std::size_t full = parts & 1U ? n + 9 : n;
    apply.input = numbers.points(full);
    if (parts & 1U)
        apply.map = numbers.choice(n, full);
    if (parts & 2U)
        apply.weights = numbers.floats(n);
    if (parts & 4U)
        apply.target = numbers.points(full);
    apply.deltas = numbers.points(n - n / 5);
    if (parts & 8U) {
        apply.slots = numbers.choice(n, n);
        for (std::size_t i = 0; i < n; i += 3)
            (*apply.slots)[i] = quill::missingIndex;
    }
    apply.current = numbers.points(n);
    apply.rest = numbers.points(n);
    for (std::uint32_t i = 0; n > 4 && i < 3; ++i)
        apply.current[i] = {static_cast<float>(i), 0.0F, 0.0F};
    quill::IndexMapper map;
    map.setIdentity(n);
    apply.frames.build(makeTopology(strip(n), n), map, &apply.rest);
    apply.frames.calculateFrames(apply.restFramesInverse, numbers.points(n), map, true, nullptr);
    return apply;
}

TEST_F(DeformerKernels, ApplyAgreesWithTheProcessorWhateverIsThere) {
    const kernels::Program program(*device(), "neuralWarpGPUNode.cl", true);
    const kernels::Program withoutDoubles(*device(), "neuralWarpGPUNode.cl", true, "-D NW_WITHOUT_DOUBLES");
    Numbers numbers(5);
    for (const std::size_t n : oddSizes)
        for (const Mode mode : {Mode::none, Mode::offset, Mode::surface})
            for (unsigned parts = 0; parts < 16; ++parts) {
                SCOPED_TRACE("n " + std::to_string(n) + ", mode " + std::to_string(static_cast<int>(mode)) +
                             ", parts " + std::to_string(parts));
                const Apply apply = makeApply(numbers, n, mode, parts);
                const Points before = numbers.points(apply.input.size());
                const Points after = apply.run(program, before);
                // the library takes rest frames as doubles, the kernel as floats
                EXPECT_TRUE(same(after, apply.expected(before), mode == Mode::surface ? 1e-5F : 0.0F));
                if (mode == Mode::surface) {
                    EXPECT_TRUE(same(apply.run(withoutDoubles, before), after));
                }
            }
}

TEST_F(DeformerKernels, NoEnvelopeMovesNothingAndAWholeMorphGoesToTheTarget) {
    const kernels::Program program(*device(), "neuralWarpGPUNode.cl", true);
    Numbers numbers(6);
    for (const Mode mode : {Mode::none, Mode::offset, Mode::surface}) {
        Apply apply = makeApply(numbers, 65, mode, 0);
        apply.envelope = 0.0F;
        EXPECT_TRUE(same(apply.run(program, Points(65)), apply.input));
        apply.target = numbers.points(65);
        apply.envelope = apply.morphEnvelope = 1.0F;
        EXPECT_TRUE(same(apply.run(program, Points(65)), *apply.target, 2e-6F));
    }
}

TEST_F(DeformerKernels, SurfaceDeltasOfAMeshThatDoesNotMoveAreOffsets) {
    const kernels::Program program(*device(), "neuralWarpGPUNode.cl", true);
    Numbers numbers(7);
    Apply apply = makeApply(numbers, 1000, Mode::surface, 0);
    apply.rest = apply.current = numbers.points(1000);
    quill::IndexMapper map;
    map.setIdentity(1000);
    apply.frames.calculateFrames(apply.restFramesInverse, apply.rest, map, true, nullptr);
    apply.deltas = numbers.points(1000);
    apply.envelope = 1.0F;
    Points moved(1000);
    for (std::size_t i = 0; i < moved.size(); ++i)
        moved[i] = apply.rest[i] + apply.deltas[i];
    EXPECT_TRUE(same(apply.run(program, Points(1000)), moved, 1e-5F));
}

} // namespace
