// SPDX-License-Identifier: Apache-2.0
// The memory of an evaluation: which arrays it takes anew, and what happens when there is none for one of them. A
// program of its own, because it replaces operator new for the whole process.
#include "plugin/deformer/support/FailureTest.h"
#include "support/watchedNew.h"

#include <tbb/global_control.h>

#include <algorithm>

namespace {

class Memory : public FailureTest {
public:
    static constexpr std::size_t columns = 40;
    static constexpr std::size_t n = (columns + 1) * (columns + 1);
    using Sizes = std::vector<std::size_t>;

    const tbb::global_control limit{tbb::global_control::max_allowed_parallelism, 1}; ///< that whose memory is watched
    static HObject largeMesh() { return unevenMesh(columns, columns); }
    void writeMyModel(std::uint32_t deltaMode, std::uint32_t smoothing) const {
        ModelSpec spec = modelSpec(n);
        spec.deltaMode = deltaMode;
        spec.smoothingIterations = smoothing;
        writeModel(modelDirectory(), spec);
    }
    HStatus evaluate(std::size_t refused = 0) {
        const HPlug output = rig->output(0);
        OpenQuarn::makeDirty(output);
        watch = {n, refused, 0, {}};
        HStatus status = OpenQuarn::evaluate(output);
        watch.threshold = SIZE_MAX;
        return status;
    }
    static Sizes large() { return {watch.sizes.begin(), watch.sizes.begin() + static_cast<long>(watch.count)}; }
};

TEST_F(Memory, OfASteadyEvaluationIsWhatTheNetworkTakes) {
    for (const std::uint32_t deltaMode : {0U, 1U})
        for (const std::uint32_t smoothing : {0U, 2U})
            for (const bool isMorphed : {false, true}) {
                writeMyModel(deltaMode, smoothing);
                makeRig(largeMesh());
                rig->setMorphTarget(0, largeMesh());
                rig->plug("targetMorphEnabled").setBool(isMorphed);
                rig->plug("targetMorphEnvelope").setDouble(0.5);
                for (int warmUp = 0; warmUp < 3; ++warmUp)
                    ASSERT_EQ(evaluate(), HStatus::kSuccess);
                ASSERT_TRUE(rig->state(0)->modelApplied);
                Sizes taken = large();
                watch = {n, 0, 0, {}};
                rig->state(0)->session.run(std::vector<float>{1.0F});
                watch.threshold = SIZE_MAX;
                Sizes expected = large();
                if (isMorphed)
                    expected.push_back(12 * n); // target points
                std::sort(taken.begin(), taken.end());
                std::sort(expected.begin(), expected.end());
                EXPECT_EQ(taken, expected) << "mode " << deltaMode << ", smoothing " << smoothing << isMorphed;
            }
}

TEST_F(Memory, ThatIsMissingForAnyArrayFailsTheEvaluation) {
    writeMyModel(1, 2);
    makeRig(largeMesh());
    ASSERT_EQ(evaluate(), HStatus::kSuccess);
    const Coordinates right = result(*rig);
    const Coordinates input = coordinates(warpRig::pointsOf(largeMesh()));
    for (const bool isFirst : {false, true}) { // building the caches, or not
        std::size_t refused = 0;
        do {
            ++refused;
            SCOPED_TRACE(std::to_string(refused) + (isFirst ? " of the first evaluation" : ""));
            makeRig(largeMesh());
            OpenQuarn::evaluate(rig->plug("originalGeometry[0]").source());
            OpenQuarn::evaluate(rig->plug("input[0].inputGeometry").source());
            if (!isFirst) {
                ASSERT_EQ(evaluate(), HStatus::kSuccess);
            }
            StdoutCapture out; // what reads the files says it there
            const HStatus status = evaluate(refused);
            out.take();
            if (watch.count < refused)
                break;
            const bool isApplied = !status.error() && rig->state(0)->modelApplied;
            EXPECT_EQ(result(*rig) == right, isApplied);
            // without its model, an evaluation may go on
            EXPECT_TRUE(isApplied || result(*rig) == input || (!status.error() && result(*rig) == rounded(input)));
            EXPECT_TRUE(isApplied || !takeMessages().empty());
            nodeOf(*rig).requestReload(0);
            EXPECT_EQ(evaluate(), HStatus::kSuccess);
            EXPECT_EQ(result(*rig), right);
        } while (refused < 1000);
        EXPECT_GT(refused, isFirst ? 24U : 1U);
    }
}

} // namespace
