// SPDX-License-Identifier: Apache-2.0
// Many geometries and nodes at a time: the same bits as one after the other, from any number of threads.
#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Evaluation.h"
#include "plugin/deformer/support/WarpTest.h"
#include "plugin/deformer/sweep.h"

#include <tbb/global_control.h>
#include <tbb/parallel_for.h>
#include <tbb/task_arena.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <thread>

namespace {

/// Evaluates plugs in one way or another.
using Evaluator = std::function<HStatus(const HPlugArray&)>;
using Results = std::vector<HPointArray>;

HStatus serial(const HPlugArray& plugs) {
    return OpenQuarn::evaluate(plugs, false);
}

/// Each of two tasks waits, for a bounded time, until the other has come.
bool aSecondThreadComes() {
    std::atomic<int> here = 0;
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    tbb::parallel_for(0, 2, [&](int) {
        ++here;
        while (here < 2 && std::chrono::steady_clock::now() < deadline)
            std::this_thread::yield();
    });
    return std::chrono::steady_clock::now() < deadline;
}

Evaluator onThreads(std::size_t threads) {
    return [threads](const HPlugArray& plugs) {
        const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, threads);
        tbb::task_arena arena(static_cast<int>(threads)); // more slots than cores, if need be
        return arena.execute([&] {
            EXPECT_TRUE(aSecondThreadComes()) << "one thread would be compared with itself";
            return OpenQuarn::evaluate(plugs, true);
        });
    };
}

void append(Results& results, const HPlugArray& plugs) {
    for (const HPlug& plug : plugs)
        results.push_back(warpRig::pointsOf(plug.asHObject()));
}

/// `build` makes a scene anew and evaluates its outputs frame after frame.
void expectSameFromAllThreads(std::size_t outputs, const std::function<Results(const Evaluator&)>& build) {
    const Results wanted = build(serial);
    for (const std::size_t threads : {2U, 7U}) {
        const Results results = build(onThreads(threads));
        ASSERT_EQ(results.size(), wanted.size());
        for (std::size_t r = 0; r < wanted.size(); ++r)
            EXPECT_EQ(firstDifference(results[r], wanted[r]), wanted[r].length())
                << threads << " threads, result " << r;
    }
    for (std::size_t r = outputs; r < wanted.size(); ++r)
        EXPECT_LT(firstDifference(wanted[r], wanted[r - outputs]), wanted[r].length())
            << "it stood still, result " << r;
}

class Parallel : public WarpTest {
protected:
    void writeModelFor(const std::string& name, unsigned vertices, unsigned deltaMode, unsigned smoothing,
                       std::size_t shapes, std::uint32_t seed) const {
        Dice dice(seed);
        ModelSpec spec;
        spec.fullCount = spec.affectCount = vertices;
        spec.deltaMode = deltaMode;
        spec.smoothingIterations = smoothing;
        for (std::size_t s = 0; s < shapes; ++s)
            spec.shapes.push_back(dice.floats(std::size_t{3} * vertices, 0.1));
        spec.controls = 3;
        spec.bias = dice.floats(shapes ? shapes : std::size_t{3} * vertices, 0.3);
        spec.weights = dice.floats(spec.controls * spec.bias.size(), 1.0);
        writeModel(modelDirectory(name), spec);
    }

    static void animate(const std::string& node, int frame) {
        const double t = 0.03 * (frame + 1);
        script("setAttr " + node + ".controlValues " + std::to_string(t) + " " + std::to_string(2 * t) + " " +
               std::to_string(3 * t));
    }
};

/// Deformers that share models, each with geometries 0, 1 and 4; everything that can change does.
TEST_F(Parallel, ManyDeformersAndFramesOfChanges) {
    writeModelFor("model0", 21 * 21, 1, 3, 5, 4);
    writeModelFor("model1", 21 * 21, 0, 0, 0, 5);
    writeModelFor("model4", 21 * 21, 1, 0, 2, 6);
    const HObject mesh = warpRig::mesh(makeGrid(20, 20));
    const HPointArray base = warpRig::pointsOf(mesh);
    expectSameFromAllThreads(15, [&](const Evaluator& evaluate) {
        session.newScene();
        Dice dice(7);
        std::vector<warpRig::Rig> rigs;
        HPlugArray outputs;
        for (int node = 0; node < 5; ++node) {
            rigs.emplace_back("warp" + std::to_string(node));
            for (const unsigned index : {0U, 1U, 4U}) {
                std::optional<std::vector<unsigned>> affected;
                if (index == 1)
                    affected = dice.chosen(200, base.length());
                rigs.back().addGeometry(index, {.mesh = warpRig::withPoints(mesh, dice.moved(base, 0.02)),
                                                .rest = mesh,
                                                .affected = affected,
                                                .weights = dice.floats(base.length(), 1.5),
                                                .modelName = "model" + std::to_string(index)});
                rigs.back().setMorphTarget(index, mesh);
                outputs.push_back(rigs.back().output(index));
            }
            rigs.back().setModelRoot(folder.path());
        }
        Results results;
        for (int frame = 0; frame < 6; ++frame) {
            for (const warpRig::Rig& rig : rigs) {
                const std::string node = HFnDependencyNode(rig.node).name().asStdString();
                animate(node, frame);
                const unsigned index = dice.pick({0U, 1U, 4U});
                const HObject now = rig.plug("input[" + std::to_string(index) + "].inputGeometry").asHObject();
                rig.setInput(index, warpRig::withPoints(now, dice.moved(base, 0.02)));
                script("setAttr " + node + ".targetMorphEnabled " + std::to_string(frame % 2) + "; setAttr " + node +
                       ".targetMorphEnvelope " + dice.pick({"0.3", "1"}));
                if (frame > 0 && dice.oneIn(2))
                    script("neuralWarp -reloadModel " + node);
            }
            EXPECT_EQ(evaluate(outputs), HStatus::kSuccess);
            append(results, outputs);
        }
        return results;
    });
    EXPECT_THAT(takeMessages(), testing::Each(testing::StartsWith("warning: ")));
}

} // namespace
