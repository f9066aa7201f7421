// SPDX-License-Identifier: Apache-2.0
// Frames without a host: the formulas in plain loops, what is refused, and what an observer sees.
#include "frame/FrameSampler.h"
#include "frame/blend.h"
#include "quill/InstructionSet.h"
#include "quill/WorkWatch.h"
#include "support/meshZoo.h"

#include <gmock/gmock.h>
#include <tbb/global_control.h>
#include <tbb/task_arena.h>

#include <atomic>
#include <chrono>
#include <stdexcept>
#include <thread>
#include <utility>

#include <cmath>
#include <cstring>

namespace {

using namespace neuralWarp;
using quill::missingIndex;
using testing::ElementsAre;
using Indices = std::vector<std::uint32_t>;
using Vec = quill::val3<float>;
using Where = Prediction::Where;

/// Gives what it holds; with controls, the first of them on top of each.
struct Given final : Network {
    std::vector<float> run(std::span<const float> controls) override {
        std::vector<float> outputs = values;
        for (float& output : outputs)
            output += controls[0];
        return outputs;
    }
    std::vector<float> values;
};

struct Seen final : FrameObserver {
    void beginStep(FrameStep step) override { steps.push_back(step); }
    void endStep(FrameStep step) override { ended.push_back(step); }
    void takeOutputs(const std::vector<float>& values) override { outputs = values; }
    std::vector<FrameStep> steps, ended;
    std::vector<float> outputs;
};

/// A grid of nine vertices, two of which a model drives from slots 3 and 0 when it is `mapped`.
struct Grid {
    explicit Grid(DeltaSettings settings, bool isMapped = false, std::uint64_t shapes = 0)
        : shapeCount(shapes)
        , model{settings,
                count,
                isMapped ? DrivenVertices(vertices, slots) : DrivenVertices(count),
                isMapped ? std::size_t{4} : count,
                {shapeBlocks, shapeCount, shapes ? count : 0},
                {connections, weights, frames, rest, restFramesInverse}} {
        map.setIdentity(count);
        connections.build(mesh.topology(), map, 0, false);
        connections.calculateConnectionWeights(weights, rest, 1.0, 0.0);
        frames.build(mesh.topology(), map, &rest);
        Points smoothed = rest;
        smoothPoints(smoothed, model.rest, settings.smoothingIterations);
        frames.calculateFrames(restFramesInverse, smoothed, map, true, nullptr);
        for (std::size_t i = 0; i < 3 * count * shapes; ++i)
            basis.push_back(0.25F * static_cast<float>(i));
        shapeBlocks.assign(basis, shapes);
    }
    Vec deltaOf(std::size_t slot, const std::vector<float>& outputs) const {
        if (shapeCount == 0)
            return {outputs[3 * slot], outputs[3 * slot + 1], outputs[3 * slot + 2]};
        Vec sum;
        for (std::size_t j = 0; j < shapeCount; ++j)
            for (std::size_t axis = 0; axis < 3; ++axis)
                sum[axis] += outputs[j] * basis[3 * (shapeCount * slot + j) + axis];
        return sum;
    }

    static constexpr std::size_t count = 9;
    ZooMesh mesh = makeGrid(2, 2);
    Points rest = mesh.points;
    Indices vertices{1, 4},
        slots{missingIndex, 3, missingIndex, missingIndex, 0, missingIndex, missingIndex, missingIndex, missingIndex};
    quill::IndexMapper map;
    quill::VertexConnections connections;
    std::vector<float> weights, basis;
    PrincipalBasis shapeBlocks;
    quill::VertexFrames frames;
    std::vector<quill::mat4d> restFramesInverse;
    std::uint64_t shapeCount;
    FrameModel model;
};

TEST(FrameSampler, PutsDrivenVerticesWhereTheFormulasSay) {
    bool isBeside = false;
    for (const DeltaSettings settings : {DeltaSettings{0, 0}, {2, 0}, {0, 1}, {2, 1}, {0, 7}})
        for (const bool isMapped : {false, true})
            for (const std::uint64_t shapes : {0U, 2U}) {
                isBeside = !isBeside;
                SCOPED_TRACE(testing::Message()
                             << "mode " << settings.deltaMode << ", " << settings.smoothingIterations << " passes, "
                             << shapes << " shapes, mapped " << isMapped << ", beside " << isBeside);
                const Grid grid(settings, isMapped, shapes);
                Given network;
                for (std::size_t i = 0; i < (shapes ? shapes : 3 * Grid::count); ++i)
                    network.values.push_back(0.5F - 0.125F * static_cast<float>(i));
                Seen seen;
                const FrameSampler sampler(grid.model, seen);
                const std::vector<float> controls{0.25F};
                Prediction prediction(network, controls, seen, isBeside ? Where::beside : Where::inLine);

                FrameWorkspace workspace;
                Points points = grid.rest, smoothed = grid.rest, result(2);
                for (std::size_t v = 0; v < points.size(); ++v)
                    points[v].z = smoothed[v].z = points[v].x * points[v].y;
                Points scratch;
                grid.connections.mushArray(smoothed, scratch, static_cast<std::size_t>(settings.smoothingIterations),
                                           1.0F, nullptr, &grid.weights, false);
                ASSERT_EQ(sampler.place(workspace, result, points, prediction).fault, FrameFault::none);
                const std::vector<float> outputs = prediction.outputs();
                EXPECT_EQ(seen.outputs, outputs);
                EXPECT_EQ(outputs.at(0), 0.75F);
                std::vector<quill::mat4d> now;
                grid.frames.calculateFrames(now, smoothed, grid.map, false, nullptr);
                Points wanted(Grid::count);
                for (std::size_t v = 0; v < Grid::count; ++v) {
                    const std::size_t slot = isMapped ? grid.slots[v] : v;
                    if (slot == missingIndex || settings.deltaMode > 1)
                        continue;
                    const Vec delta = grid.deltaOf(slot, outputs);
                    wanted[v] = settings.deltaMode == 0
                                    ? smoothed[v] + delta
                                    : transportDelta(grid.rest[v], delta, grid.restFramesInverse[v], now[v]);
                }
                EXPECT_EQ(result, wanted);
                std::vector<FrameStep> steps{FrameStep::network, FrameStep::points, FrameStep::deltas,
                                             FrameStep::apply};
                if (isBeside)
                    std::swap(steps[0], steps[1]);
                EXPECT_EQ(seen.steps, steps);
                EXPECT_EQ(seen.ended, seen.steps);
            }
}

/// Waits, for a bounded time, until the caller is where it should be meanwhile, and then gives nothing or throws.
struct Held final : Network {
    std::vector<float> run(std::span<const float>) override {
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
        while (!isReached && std::chrono::steady_clock::now() < deadline)
            std::this_thread::yield();
        isAlone = !isReached;
        if (throws)
            throw std::runtime_error("no network");
        isDone = true;
        return {};
    }
    std::atomic<bool> isReached = false;
    bool isAlone = false, isDone = false, throws = false;
};

TEST(Prediction, RunsBesideTheFrameAndEndsWithIt) {
    const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, 2);
    tbb::task_arena arena(2);  // also on one core
    const Grid grid({200, 1}); // looks for a cancellation as it begins, and later
    for (const std::string outcome : {"nothing", "thrown", "cancelled"}) {
        SCOPED_TRACE(outcome);
        Held network;
        network.throws = outcome == "thrown";
        Seen seen;
        FrameWorkspace workspace;
        Points result(3);
        const auto frame = [&] {
            Prediction prediction(network, {}, seen, Where::beside);
            return FrameSampler(grid.model, seen).place(workspace, result, grid.rest, prediction, [&] {
                network.isReached = true;
                return outcome == "cancelled";
            });
        };
        std::string ended;
        arena.execute([&] {
            try {
                ended = frame().fault == FrameFault::noOutputs ? "nothing" : "placed";
            } catch (const std::runtime_error&) {
                ended = "thrown";
            } catch (const quill::Cancelled&) {
                ended = "cancelled";
            }
        });
        EXPECT_EQ(ended, outcome);
        EXPECT_FALSE(network.isAlone) << "it ran where the frame is, which waited for it";
        EXPECT_TRUE(network.isDone || outcome != "nothing");
        EXPECT_EQ(result, Points(3)) << "as it was";
        EXPECT_EQ(seen.ended, seen.steps);
    }
}

TEST(Prediction, StaysInLineWhereNobodyCanCome) {
    EXPECT_EQ(Prediction::bestFor(2), Where::inLine);
    const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, 1);
    EXPECT_EQ(Prediction::bestFor(1000000), Where::inLine);
}

TEST(FrameSampler, RefusesWhatDoesNotReachEveryVertex) {
    struct Row {
        const char* name;
        std::size_t points, outputs;
        std::uint64_t shapes;
        std::size_t basis, restFrames;
        FrameFault fault;
        std::size_t has, needed;
        bool reachesAllSlots;
    };
    const Row rows[] = {
        {"all there", 9, 27, 0, 0, 9, FrameFault::none, 9, 9, true},
        {"more than that", 9, 29, 0, 0, 9, FrameFault::none, 9, 9, true},
        {"points", 8, 27, 0, 0, 9, FrameFault::otherPointCount, 8, 9, true},
        {"no outputs", 9, 0, 0, 0, 9, FrameFault::noOutputs, 0, 0, false},
        {"a third of a delta", 9, 26, 0, 0, 9, FrameFault::tooFewDeltas, 8, 9, false},
        {"coefficients", 9, 2, 2, 54, 9, FrameFault::none, 9, 9, true},
        {"too few coefficients", 9, 1, 2, 54, 9, FrameFault::tooFewCoefficients, 1, 2, false},
        {"basis", 9, 2, 2, 53, 9, FrameFault::tooFewDeltas, 8, 9, false},
        {"rest frames", 9, 27, 0, 0, 8, FrameFault::tooFewRestPoints, 8, 9, true},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        Grid grid({0, 1}, false, row.shapes);
        grid.basis.resize(row.basis);
        grid.shapeBlocks.assign(grid.basis, row.shapes);
        grid.restFramesInverse.resize(row.restFrames);
        Points points(row.points), result{{1, 2, 3}};
        const std::vector<float> outputs(row.outputs);
        FrameWorkspace workspace;
        const FrameCheck check = FrameSampler(grid.model).place(workspace, result, points, outputs);
        EXPECT_EQ(check.fault, row.fault);
        EXPECT_EQ(result.size(), row.fault == FrameFault::none ? Grid::count : 1U);
        if (row.fault != FrameFault::none) {
            EXPECT_EQ(check.has, row.has);
            EXPECT_EQ(check.needed, row.needed);
        }
        EXPECT_EQ(areEnoughForAllSlots(grid.model, row.outputs), row.reachesAllSlots);
    }
    Grid grid({0, 0}, true, 2); // reads four slots; the counts of the basis speak of nine
    grid.basis.resize(6 * 4);
    grid.shapeBlocks.assign(grid.basis, 2);
    EXPECT_EQ(checkOutputs(grid.model, 2).fault, FrameFault::none);
    EXPECT_FALSE(areEnoughForAllSlots(grid.model, 2));
}

TEST(FrameSampler, EndsLongSmoothingOnRequest) {
    const Grid grid({1000, 0});
    int looks = 0;
    FrameWorkspace workspace;
    Points result;
    Seen seen;
    EXPECT_THROW(FrameSampler(grid.model, seen)
                     .place(workspace, result, grid.rest, std::vector<float>(), [&] { return ++looks == 3; }),
                 quill::Cancelled);
    EXPECT_EQ(looks, 3);
    EXPECT_THAT(seen.ended, ElementsAre(FrameStep::points));
}

TEST(PrincipalBasis, KeepsTheShapesAndAddsThemInOrderWithEveryInstructionSet) {
    for (const std::size_t slots : {1U, 15U, 16U, 37U})
        for (const std::size_t shapes : {1U, 2U, 51U}) {
            SCOPED_TRACE(testing::Message() << slots << " slots, " << shapes << " shapes");
            std::vector<float> values(3 * slots * shapes), coefficients(shapes);
            for (std::size_t i = 0; i < values.size(); ++i)
                values[i] = 1.0F / static_cast<float>(1 + i % 91);
            for (std::size_t j = 0; j < shapes; ++j)
                coefficients[j] = (j % 2 ? -1.0F : 1.0F) / static_cast<float>(3 + j);
            Points wanted(slots);
            for (std::size_t slot = 0; slot < slots; ++slot)
                for (std::size_t j = 0; j < shapes; ++j)
                    for (std::size_t axis = 0; axis < 3; ++axis)
                        wanted[slot][axis] += coefficients[j] * values[3 * (shapes * slot + j) + axis];
            PrincipalBasis basis;
            values.push_back(9); // no slot
            basis.assign(values, shapes);
            values.pop_back();
            EXPECT_EQ(basis.slotMajor(), values);
            PrincipalBasis pieces;
            pieces.resize(slots, shapes);
            for (std::size_t slot = 0; slot < slots; slot += 7)
                pieces.set(slot, std::span(values).subspan(3 * shapes * slot,
                                                           3 * shapes * std::min(slots - slot, std::size_t{7})));
            EXPECT_EQ(pieces.slotMajor(), values);
            for (const auto set : {quill::InstructionSet::plain, quill::processorInstructionSet()}) {
                quill::limitInstructionSet(set);
                Points sums(slots);
                basis.sum(sums.data(), coefficients.data(), 0, basis.blockCount());
                EXPECT_EQ(sums, wanted);
            }
        }
    PrincipalBasis none;
    none.assign({1, 2, 3}, 0);
    EXPECT_EQ(none.blockCount() + none.slotMajor().size(), 0U);
}

TEST(PrincipalBasis, HalvesAreTheFloatsThatTheyStandFor) {
    constexpr std::uint32_t finite = 0x7C00; // halves of one sign
    constexpr std::size_t shapes = 31, slots = 2 * finite / (3 * shapes);
    const auto number = [](std::uint32_t half) { // by the definition
        const auto fraction = static_cast<double>(half & 0x3FFU);
        const int exponent = static_cast<int>(half >> 10U & 31U);
        const double magnitude = exponent == 0 ? std::ldexp(fraction, -24) : std::ldexp(1024 + fraction, exponent - 25);
        return static_cast<float>((half & 0x8000U) != 0 ? -magnitude : magnitude);
    };
    std::vector<float> scales(shapes), coefficients(shapes), values;
    for (std::size_t j = 0; j < shapes; ++j) {
        scales[j] = j % 3 == 0 ? std::ldexp(1.0F, -static_cast<int>(j)) : 0.001F * static_cast<float>(j);
        coefficients[j] = (j % 2 ? -1.0F : 1.0F) / static_cast<float>(3 + j);
    }
    std::vector<std::uint16_t> halves;
    for (std::size_t i = 0; i < 3 * shapes * slots; ++i) { // nearly all that there are
        const std::size_t half = i < finite ? i : 0x8000 + i - finite;
        halves.push_back(static_cast<std::uint16_t>(half));
        values.push_back(scales[i / 3 % shapes] * number(halves.back()));
    }
    PrincipalBasis floats, basis;
    floats.assign(values, shapes);
    basis.resizeHalves(slots, scales);
    const std::size_t part = 3 * shapes * 21;
    basis.set(0, std::span<const std::uint16_t>(halves).first(part));
    basis.set(21, std::span<const std::uint16_t>(halves).subspan(part));
    EXPECT_EQ(basis.slotMajor(), values);
    EXPECT_LT(basis.bytes(), 6 * floats.bytes() / 10);
    Points wanted(slots);
    floats.sum(wanted.data(), coefficients.data(), 0, floats.blockCount());
    for (const auto set :
         {quill::InstructionSet::plain, quill::InstructionSet::avx, quill::processorInstructionSet()}) {
        quill::limitInstructionSet(set);
        Points sums(slots);
        basis.sum(sums.data(), coefficients.data(), 0, basis.blockCount());
        EXPECT_EQ(std::memcmp(sums.data(), wanted.data(), slots * sizeof(sums[0])), 0);
    }
}

TEST(Blend, GoesByEnvelopeAndWeightTowardsTheModelAndTheTarget) {
    const Indices driven{1}, slots{missingIndex, 0}, listed{2, 0};
    const Points model{{9, 9, 9}, {3, 0, 0}}, target{{1, 1, 0}, {1, 2, 0}};
    const std::vector<float> weights{1.0F, 0.5F};
    struct Row {
        const char* name;
        const Points *model, *target;
        const float* weights;
        double x0, x1, y1;
    };
    const double third = 1.0 / 3.0, rounded = static_cast<double>(static_cast<float>(third));
    const double same = third + (rounded - third) * 0.5;
    for (const Row& row :
         {Row{"nothing", nullptr, nullptr, nullptr, same, 1.0, 0.0},
          {"model", &model, nullptr, nullptr, same, 2.0, 0.0},
          {"weights", &model, nullptr, weights.data(), same, 1.5, 0.0},
          {"target", nullptr, &target, nullptr, third + (0.5 * (1 + rounded) - third) * 0.5, 1.0, 0.5},
          {"both", &model, &target, weights.data(), third + (0.5 * (1 + rounded) - third) * 0.5, 1.25, 0.25}})
        for (const bool isListed : {false, true})
            for (const bool isInPlace : {false, true}) {
                SCOPED_TRACE(std::string(row.name) + (isListed ? ", listed" : "") + (isInPlace ? ", in place" : ""));
                const std::size_t first = isListed ? 6 : 0, second = isListed ? 0 : 3;
                std::vector<double> from(9), to(9, 7.0);
                from[first] = third;
                from[second] = 1.0;
                const Blend blend{DrivenVertices(driven, slots), row.model, row.target, 0.5F, 0.5F};
                ASSERT_TRUE(blend.fits(2) && (!(row.model || row.target) || !blend.fits(3)));
                std::vector<double>& out = isInPlace ? from : to;
                const double beside = out[isListed ? 3 : 6];
                blendPositions({from.data(), out.data(), 2, isListed ? listed.data() : nullptr}, row.weights, blend);
                EXPECT_NEAR(out[first], row.x0, row.target ? 1e-7 : 0.0);
                EXPECT_EQ(out[second], row.x1);
                EXPECT_EQ(out[second + 1], row.y1);
                EXPECT_EQ(out[isListed ? 3 : 6], beside);
            }
}

TEST(Blend, HasTheSameBitsWhereAllGoTheSameWay) {
    const std::size_t count = 1001;
    Points model(count);
    std::vector<double> from(3 * count), to(3 * count), other(3 * count);
    const std::vector<float> weights(count, 1.0F);
    for (std::size_t i = 0; i < from.size(); ++i) {
        from[i] = std::sin(static_cast<double>(i));
        (&model.front().x)[i] = static_cast<float>(std::cos(static_cast<double>(i * i)));
    }
    const Blend blend{DrivenVertices(count), &model, nullptr, 0.0F, 0.3F};
    blendPositions({from.data(), to.data(), count}, nullptr, blend);
    blendPositions({from.data(), other.data(), count}, weights.data(), blend);
    EXPECT_EQ(to, other);
}

} // namespace
