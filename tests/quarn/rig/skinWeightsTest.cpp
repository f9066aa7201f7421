// SPDX-License-Identifier: Apache-2.0
#include "rig/SkinWeights.h"
#include "rig/linearBlend.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <oneapi/tbb/global_control.h>

#include <limits>
#include <random>
#include <string>

#include "openquarn/HString.h"

namespace {

using rig::makeSkinWeights;
using rig::SkinWeights;
using ::testing::ElementsAre;

using List = std::vector<double>;
constexpr double infinity = std::numeric_limits<double>::infinity();
constexpr double notANumber = std::numeric_limits<double>::quiet_NaN();

std::string problemOf(const List& counts, const List& influences, const List& weights, SkinWeights& skin) {
    const HStatus status = makeSkinWeights({counts, influences, weights}, true, skin);
    return status.error() ? status.errorString().asStdString() : "";
}

TEST(SkinWeightsOf, DamagedListsAreRefusedByNameAndValue) {
    struct Row {
        List counts, influences, weights;
        std::string problem;
    };
    const std::string whole = ", not a whole number from 0 to 4294967295";
    const Row rows[] = {
        {{1, -1}, {0}, {1}, "influenceCounts[1] is -1" + whole},
        {{0.5}, {0}, {1}, "influenceCounts[0] is 0.5" + whole},
        {{notANumber}, {0}, {1}, "influenceCounts[0] is nan" + whole},
        {{1, 4294967296}, {0}, {1}, "influenceCounts[1] is 4294967296" + whole},
        {{4294967295, 1}, {0}, {1}, "influenceCounts add up to 4294967296, more than there can be"},
        {{4294967295}, {0}, {1}, "influences has 1 values; the influenceCounts add up to 4294967295"},
        {{1, 2}, {0, 1}, {1, 1}, "influences has 2 values; the influenceCounts add up to 3"},
        {{1, 1}, {0, 1}, {1}, "skinWeights has 1 values; the influenceCounts add up to 2"},
        {{}, {0}, {1}, "influences has 1 values; the influenceCounts add up to 0"},
        {{2}, {0, -3}, {1, 1}, "influences[1] is -3" + whole},
        {{2}, {0, 1e300}, {1, 1}, "influences[1] is 1e+300" + whole},
        {{2}, {infinity, 0}, {1, 1}, "influences[0] is inf" + whole},
        {{2}, {0, 1}, {1, notANumber}, "skinWeights[1] is nan"},
        {{0, 2}, {0, 1}, {1.5e308, 1.5e308}, "skinWeights of vertex 1 add up to inf"},
    };
    for (const Row& row : rows) {
        SkinWeights skin;
        skin.joints = {7};
        EXPECT_EQ(problemOf(row.counts, row.influences, row.weights, skin), row.problem);
        EXPECT_THAT(skin.joints, ElementsAre(7)) << row.problem;
    }
}

TEST(SkinWeightsOf, SharesOfNothingAreLeftOutAndJointsAreCounted) {
    SkinWeights skin;
    // the largest index that there is takes no more memory than the least
    EXPECT_EQ(problemOf({2, 0, 3, 2}, {4294967295, 5, 9, 2, 5, 5, 2}, {1, 3, 0, 2, 2, 1, -1}, skin), "");
    EXPECT_THAT(skin.joints, ElementsAre(2, 5, 4294967295));
    EXPECT_THAT(skin.first, ElementsAre(0, 2, 2, 4, 6));
    List weights;
    std::vector<unsigned> joints;
    for (const rig::Influence& influence : skin.influences) {
        weights.push_back(influence.weight);
        joints.push_back(influence.joint);
    }
    EXPECT_THAT(joints, ElementsAre(2, 1, 0, 1, 1, 0));
    EXPECT_THAT(weights, ElementsAre(0.25, 0.75, 0.5, 0.5, 1, -1)); // a sum of 0 divides nothing
}

/// Vertices with 0 to 9 of 40 influences each.
class BlendPoints : public ::testing::Test {
protected:
    BlendPoints() {
        std::uniform_real_distribution<double> any(-2, 2);
        for (unsigned v = 0; v < vertices; ++v) {
            counts.push_back(v % 10);
            start.append(HPoint(any(random), any(random), any(random)));
            pointWeights.push_back(v % 3 == 0 ? 1.0F : static_cast<float>(any(random)));
            for (unsigned k = 0; k < v % 10; ++k) {
                influences.push_back((v * 7 + k) % 40);
                weights.push_back(any(random));
            }
        }
        for (rig::Affine& joint : joints)
            for (double& value : joint)
                value = any(random);
    }

    HPoint expected(std::size_t v, std::size_t position, double factor) const {
        const HPoint p = start[v];
        HPoint sum(0, 0, 0);
        for (std::size_t k = position; k < position + v % 10; ++k)
            for (unsigned c = 0; c < 3; ++c) {
                const rig::Affine& m = joints[static_cast<std::size_t>(influences[k])];
                sum[c] += weights[k] * (p.x * m[c] + p.y * m[3 + c] + p.z * m[6 + c] + m[9 + c]);
            }
        if (v % 10 == 0)
            return p;
        return factor == 1.0 ? sum : p + (sum - p) * factor;
    }

public:
    static constexpr unsigned vertices = 20'001;
    std::mt19937 random{5};
    List counts, influences, weights;
    std::vector<float> pointWeights;
    std::vector<rig::Affine> joints = std::vector<rig::Affine>(40);
    HPointArray start;
    const HUintArray all;
};

TEST_F(BlendPoints, AreThePlainLoopOnAnyNumberOfThreads) {
    SkinWeights skin;
    ASSERT_FALSE(makeSkinWeights({counts, influences, weights}, false, skin).error());
    for (const double envelope : {1.0, 0.3})
        for (const unsigned threads : {1U, 2U, 7U}) {
            const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, threads);
            HPointArray points = start;
            rig::blendPoints({skin, joints, all, pointWeights.data(), envelope}, points);
            std::size_t position = 0;
            for (unsigned v = 0; v < vertices; position += v++ % 10)
                ASSERT_EQ(points[v], expected(v, position, envelope * static_cast<double>(pointWeights[v])))
                    << v << ' ' << threads;
        }
}

TEST_F(BlendPoints, OfSomeVerticesAreThoseOfAll) {
    SkinWeights skin;
    ASSERT_FALSE(makeSkinWeights({counts, influences, weights}, true, skin).error());
    HPointArray whole = start, part;
    HUintArray chosen;
    for (unsigned v = vertices; v-- > 0;)
        if (v % 3 != 1) {
            chosen.append(v);
            part.append(start[v]);
        }
    rig::blendPoints({skin, joints, all, nullptr, 1.0}, whole);
    rig::blendPoints({skin, joints, chosen, nullptr, 1.0}, part);
    for (unsigned i = 0; i < chosen.length(); ++i)
        ASSERT_EQ(part[i], whole[chosen[i]]);
}

} // namespace
