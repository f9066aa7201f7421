// SPDX-License-Identifier: Apache-2.0
// Whole scenes in the host's pipeline: the device makes the frames of the CPU, launches what it has to and no more, and
// uploads what changed.
#include "plugin/deformer/gpu/ParityTest.h"

#include "host/support/testNodes.h"

#include <array>
#include <functional>

namespace {

using namespace parity;
using OpenQuarn::Gpu;
using OpenQuarn::GpuCounts;
using testing::IsEmpty;

class Parity : public ParityTest {
protected:
    /// Three frames of every geometry: the first on the device, one more, and that again without doubles.
    void check(const Wish& wish, std::uint32_t seed) {
        session.newScene();
        const Scene scene(folder.path(), seed, wish);
        prime(scene);
        for (std::size_t g = 0; g < scene.geometryCount(); ++g)
            countSlots(scene.state(g));
        std::vector<HPointArray> last;
        for (const bool isFirst : {true, false}) {
            scene.pose(seed + (isFirst ? 100 : 200));
            last.clear();
            for (std::size_t g = 0; g < scene.geometryCount(); ++g)
                last.push_back(checkFrame(scene, g, isFirst));
        }
        Gpu::assumeNoDoubles(true);
        scene.pose(seed + 200);
        for (std::size_t g = 0; g < scene.geometryCount(); ++g)
            EXPECT_TRUE(areSame(evaluated(scene, g).points, last[g])) << "without doubles, geometry " << g;
        Gpu::assumeNoDoubles(false);
        takeMessages();
    }

    static void expectWork(const Scene& scene, std::size_t g, const GpuCounts& counts, bool isFirst) {
        EXPECT_EQ(counts.gpuEvaluations, 1U);
        EXPECT_EQ(counts.cpuEvaluations, 0U);
        EXPECT_EQ(counts.launches, scene.launches(g));
        EXPECT_EQ(counts.downloads, 1U);
        EXPECT_EQ(counts.bytesDown, scene.positionBytes(g));
        if (isFirst)
            return;
        EXPECT_EQ(counts.uploads, scene.uploads(g));
        EXPECT_EQ(counts.bytesUp, scene.bytesUp(g));
    }

    HPointArray checkFrame(const Scene& scene, std::size_t g, bool isFirst) {
        SCOPED_TRACE("geometry " + std::to_string(g) + (isFirst ? ", first" : ", second") + " frame");
        const Frame gpu = evaluated(scene, g);
        const HPointArray cpu = deformed(scene, g);
        EXPECT_EQ(gpu.status, HStatus::kSuccess);
        if (scene.isForTheCpu(g)) {
            ++leftToTheCpu;
            EXPECT_EQ(gpu.counts.fallbacks, 1U);
            EXPECT_TRUE(areSame(gpu.points, cpu));
            EXPECT_EQ(takeMessages().size(), isFirst ? 1U : 0U);
            return gpu.points;
        }
        ++onTheDevice;
        EXPECT_THAT(takeMessages(), IsEmpty());
        expectWork(scene, g, gpu.counts, isFirst);
        EXPECT_GT(largestDistance(cpu, scene.input(g)), 0.01 * diagonal(scene.input(g))) << "nothing moved";
        expectNear(scene, g, gpu.points, cpu);
        return gpu.points;
    }

    void countSlots(const neuralWarp::neuralWarpData& data) {
        mapped += data.useAffectMap ? 1U : 0U;
        const bool isPartial = std::count(data.affectMap.begin(), data.affectMap.end(), quill::missingIndex) != 0;
        withoutSlots += isPartial ? 1U : 0U;
    }

    unsigned onTheDevice = 0, leftToTheCpu = 0; ///< frames
    unsigned mapped = 0, withoutSlots = 0;      ///< geometries with a map of slots, and with vertices that have none
};

/// On the CPU they leave the model's vertices at the origin: there is no frame to compare with.
TEST_F(Parity, ModesThatThereAreNotAreOffsets) {
    std::vector<HPointArray> frames;
    frames.reserve(3);
    for (const std::uint32_t mode : {0U, 2U, 65537U}) {
        session.newScene();
        const GeometryWish one{.mesh = makeGrid(5, 4), .deltaMode = mode, .passes = 1};
        const Scene scene(folder.path(), 3, {{one}});
        prime(scene);
        scene.pose(4);
        const Frame gpu = evaluated(scene);
        EXPECT_EQ(gpu.counts.launches, scene.launches());
        frames.push_back(gpu.points);
        EXPECT_TRUE(areSame(frames.front(), frames.back())) << mode;
    }
}

/// Polygons of three to seven corners, some over others, and vertices without any.
ZooMesh randomMesh(Dice& dice) {
    ZooMesh mesh{"random", {}, {}};
    const unsigned count = 5 + dice.below(60);
    for (unsigned i = 0; i < count; ++i) {
        const auto [x, y, z] = std::array{dice.real(2.0), dice.real(1.0), dice.real(1.5)}; // in this order
        mesh.points.emplace_back(static_cast<float>(x), static_cast<float>(y), static_cast<float>(z));
    }
    const unsigned polygons = 1 + dice.below(2 * std::size_t{count});
    for (unsigned p = 0; p < polygons; ++p) {
        const std::vector<unsigned> corners = dice.chosen(std::min(3 + dice.below(5), count - 1), count);
        mesh.polygons.emplace_back(corners.begin(), corners.end());
    }
    return mesh;
}

GeometryWish randomGeometry(Dice& dice, const ZooMesh& mesh) {
    const std::uint32_t mode = dice.below(2);
    const std::uint32_t passes = dice.pick({0U, 1U, 2U, 5U, 10U});
    return {.mesh = mesh,
            .deltaMode = mode,
            .passes = passes,
            .shapes = dice.pick({0U, 0U, 1U, 4U, 9U}),
            .isPart = dice.oneIn(2),
            .isOtherPart = dice.oneIn(2),
            .isWeighted = dice.oneIn(2)};
}

TEST_F(Parity, OfMeshesAndModelsByChance) {
    for (std::uint32_t seed = 0; seed < 200; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        Dice dice(seed);
        std::vector<GeometryWish> geometries;
        for (unsigned g = 1 + dice.below(3); g > 0; --g) {
            const ZooMesh& ofZoo = meshZoo()[1 + dice.below(meshZoo().size() - 1)];
            geometries.push_back(randomGeometry(dice, dice.oneIn(3) ? ofZoo : randomMesh(dice)));
        }
        const double envelope = dice.pick({1.0, 0.5, 2.0, -1.0});
        const double morph = dice.pick({0.0, 0.0, 0.25, 0.75, 1.0, 2e-6, 1.0 - 1e-4, 1.0 - 5e-7});
        geometries.front().isModelOn = morph < 0.1 || !dice.oneIn(3); // something is to move
        check({geometries, envelope, morph == 0.0 ? std::nullopt : std::optional<double>(morph)}, seed + 1);
        ASSERT_FALSE(HasFailure());
    }
    EXPECT_GT(onTheDevice, 500U);
    EXPECT_LT(leftToTheCpu, onTheDevice / 4);
    EXPECT_GT(mapped, 100U);
    EXPECT_GT(withoutSlots, 60U);
}

TEST_F(Parity, OfAModelThatIsExported) {
    const Scene scene(folder.path(), 5, {{{.mesh = makeGrid(5, 4), .deltaMode = 1, .passes = 1}}});
    prime(scene);
    script("setAttr warp1.export[0].smoothingIterations 2; neuralWarp warp1 -exportActive 1");
    prime(scene);
    scene.pose(9);
    const Frame gpu = evaluated(scene);
    EXPECT_EQ(gpu.counts.gpuEvaluations, 1U);
    EXPECT_THAT(gpu.counts.launches, IsEmpty());
    EXPECT_TRUE(areSame(gpu.points, scene.input()));
    EXPECT_TRUE(areSame(gpu.points, deformed(scene)));
    script("neuralWarp warp1 -exportActive 0");
    prime(scene);
    scene.pose(10);
    checkFrame(scene, 0, true);
}

/// What an evaluation gives up goes on in the next one: on the CPU, until there is nothing left to go on with.
TEST_F(Parity, OfAModelThatIsMended) {
    using Write = std::function<void(const Scene&)>;
    const Write good = [](const Scene& scene) { writeModel(scene.modelDirectory(), scene.model()); };
    const Write drivesNothing = [](const Scene& scene) {
        ModelSpec model = scene.model();
        model.subsetState = "partial";
        model.affectMap = {model.fullCount};
        writeModel(scene.modelDirectory(), model);
    };
    const Write noMetadata = [](const Scene& scene) { writeFile(scene.modelDirectory() / "metadata.json", "{"); };
    const Write noDirectory = [](const Scene& scene) { std::filesystem::remove_all(scene.modelDirectory()); };
    struct Row {
        const char* name;
        Write spoil;
        std::string whileSpoilt, whenMended; ///< where four frames each are made: on the CPU, or the GPU
    };
    const Row rows[] = {{"drives nothing", drivesNothing, "CGGG", "CCGG"},
                        {"no metadata, and the network of before", noMetadata, "CCGG", "CGGG"},
                        {"nothing there", noDirectory, "CCCG", "CGGG"}};
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        std::vector<HPointArray> frames[2];
        std::string where;
        for (const bool isOn : {false, true}) {
            session.newScene();
            Gpu::setEnabled(isOn);
            const Scene scene(folder.path(), 3, {{{.mesh = makeGrid(5, 4), .deltaMode = 1, .passes = 1}}});
            prime(scene);
            for (const Write& write : {row.spoil, good}) {
                write(scene);
                script("neuralWarp warp1 -reloadModel");
                for (std::uint32_t seed = 1; seed <= 4; ++seed) {
                    scene.pose(seed);
                    const Frame frame = evaluated(scene);
                    frames[isOn].push_back(frame.points);
                    where += !isOn ? "" : frame.counts.gpuEvaluations == 1 ? "G" : "C";
                }
            }
            EXPECT_GT(largestDistance(frames[isOn].back(), scene.input()), 0.01 * diagonal(scene.input()));
            for (std::size_t i = 0; isOn && i < where.size(); ++i)
                expectNear(scene, 0, frames[1][i], frames[0][i]);
            takeMessages();
        }
        EXPECT_EQ(where, row.whileSpoilt + row.whenMended);
    }
}

TEST_F(Parity, OfTwoDeformersOneAfterTheOther) {
    const Wish wishes[] = {
        {{{.mesh = makeGrid(6, 5), .deltaMode = 1, .passes = 2, .shapes = 3, .isPart = true}}},
        {{{.mesh = makeGrid(6, 5), .passes = 1, .isOtherPart = true, .isWeighted = true}}, 0.75, 0.5}};
    const Scene first(folder.path(), 1, wishes[0]);
    const Scene second(folder.path(), 2, wishes[1], "warp2", &first);
    prime(second);
    for (const std::uint32_t seed : {10U, 20U, 30U}) {
        first.pose(seed);
        second.pose(seed + 1);
        const Frame gpu = evaluated(second);
        EXPECT_EQ(gpu.counts.gpuEvaluations, 2U);
        EXPECT_EQ(gpu.counts.launches.at("averageVertKernel"), 3U);
        EXPECT_EQ(gpu.counts.launches.at("gpu_apply_deltas_kernel"), 2U);
        EXPECT_EQ(gpu.counts.bytesDown, second.positionBytes());
        if (seed != 10) {
            EXPECT_EQ(gpu.counts.bytesUp, first.bytesUp() + second.bytesUp());
        }
        const HPointArray cpu = deformed(second);
        EXPECT_GT(largestDistance(cpu, first.input()), 0.01 * diagonal(cpu));
        const double size = second.size(0, cpu);
        EXPECT_LE(largestDistance(gpu.points, cpu), (surface.relative + offset.relative) * size);
    }
}

/// Ten frames of each: the number goes from 0 to 1 and back, for the morph 0.3 lower, or the switch to and fro.
TEST_F(Parity, OfEnvelopesAndSwitchesThatAreAnimated) {
    for (const std::string key : {"envelope", "targetMorphEnvelope", "targetMorphEnabled", "models[0].modelActive"}) {
        SCOPED_TRACE(key);
        session.newScene();
        const GeometryWish one{.mesh = makeGrid(6, 5), .deltaMode = 1, .passes = 2, .shapes = 2};
        const Scene scene(folder.path(), 11, {{one}, 1.0, 0.5});
        testNodes::create("testCase", "key");
        testNodes::plug("key.in").setDouble(0.0);
        testNodes::connect("key.out", "warp1." + key);
        prime(scene);
        for (int i = 1; i <= 10; ++i) {
            SCOPED_TRACE(i);
            const bool isSwitch = key.front() == 'm' || key == "targetMorphEnabled";
            const double highest = key.front() == 't' ? 0.7 : 1.0;
            testNodes::plug("key.in").setDouble(isSwitch ? i % 2 : highest - std::abs(i - 5) / 5.0);
            const Frame keyed = evaluated(scene);
            EXPECT_EQ(keyed.counts.cpuEvaluations, 1U) << "whether a model is applied is decided there";
            EXPECT_TRUE(areSame(keyed.points, deformed(scene)));
            scene.pose(50 + static_cast<std::uint32_t>(i));
            const Frame gpu = evaluated(scene);
            EXPECT_EQ(gpu.counts.gpuEvaluations, 1U);
            const HPointArray cpu = deformed(scene);
            expectNear(scene, 0, gpu.points, cpu);
            const bool isFlat = key == "envelope" && i == 10;
            EXPECT_EQ(gpu.counts.launches.empty(), isFlat);
            EXPECT_EQ(gpu.counts.uploads.count("positions"), isFlat ? 0U : 1U);
            EXPECT_EQ(largestDistance(cpu, scene.input()) <= 0.01 * diagonal(cpu), isFlat);
        }
    }
}

} // namespace
