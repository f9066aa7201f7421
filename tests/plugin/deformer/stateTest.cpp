// SPDX-License-Identifier: Apache-2.0
// The state of one geometry: every operation as a table of what it does to flags, counters and maps.
#include "deformer/neuralWarpNode.h"
#include "plugin/deformer/support/WarpTest.h"
#include "plugin/deformer/support/stateText.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/TapiCastAnim.h"

#include <functional>

namespace {

using namespace neuralWarp;
using stateText::never;
using stateText::raised;
using testing::ElementsAre;
using testing::IsEmpty;

using Indices = std::vector<std::uint32_t>;
constexpr std::uint32_t none = quill::missingIndex;

bool operator==(const DeltaSettings& a, const DeltaSettings& b) {
    return a.smoothingIterations == b.smoothingIterations && a.deltaMode == b.deltaMode;
}

TEST(State, StartsWithEverythingDirtyAndNothingBuilt) {
    const neuralWarpData data;
    EXPECT_EQ(data.typeId().id(), 0x58000972U);
    EXPECT_EQ(data.name().asStdString(), "neuralWarpData");
    EXPECT_EQ(raised(data), "topology indexMap connections restFrames load metadata path");
    EXPECT_THAT(data.cacheVersions, ElementsAre(never, never, never, never, never));
    for (const DeltaSettings& settings : {data.activeSettings, data.modelSettings, data.exportSettings})
        EXPECT_TRUE(settings == (DeltaSettings{0, 1}));
    EXPECT_EQ(data.multiIndex, 0U);
    EXPECT_FALSE(data.canApplyModel());
    EXPECT_TRUE(data.isVertexAffected(7));
}

TEST(State, VersionsNeverComeBackToNever) {
    const std::pair<std::uint32_t, std::uint32_t> rows[] = {
        {never, 0}, {0, 1}, {41, 42}, {0xFFFFFFFD, 0xFFFFFFFE}, {0xFFFFFFFE, 0}};
    for (auto [version, next] : rows) {
        neuralWarpData::bumpVersion(version);
        EXPECT_EQ(version, next);
    }
}

TEST(State, OperationsRaiseAndLowerTheirFlagsOnly) {
    const std::string everything = "topology indexMap connections restFrames load metadata path";
    struct Row {
        const char* name;
        const char* before;
        std::function<void(neuralWarpData&)> operation;
        std::string after;
        DeltaSettings active;
    };
    const auto apply = [](DeltaSettings from, DeltaSettings to) {
        return [=](neuralWarpData& data) {
            data.activeSettings = from;
            data.applySettings(to);
        };
    };
    const auto exportMode = [](bool on) {
        return [=](neuralWarpData& data) {
            data.exportSettings = {2, 0};
            data.modelSettings = {5, 1};
            data.setExportMode(on);
        };
    };
    const Row rows[] = {
        {"all dirty", "", [](auto& d) { d.markAllDirty(); }, everything, {0, 1}},
        {"all dirty keeps the rest",
         "applied export valid affectMap",
         [](auto& d) { d.markAllDirty(); },
         everything + " applied export valid affectMap",
         {0, 1}},
        {"path dirty", "", [](auto& d) { d.setModelPathDirty(true); }, "load metadata path", {0, 1}},
        {"path clean", "load metadata path", [](auto& d) { d.setModelPathDirty(false); }, "load metadata", {0, 1}},
        {"the same", "", apply({3, 1}, {3, 1}), "", {3, 1}},
        {"smoothing on", "", apply({0, 1}, {3, 1}), "connections restFrames", {3, 1}},
        {"smoothing off", "", apply({3, 1}, {0, 1}), "connections restFrames", {0, 1}},
        {"more smoothing", "", apply({3, 1}, {5, 1}), "restFrames", {5, 1}},
        {"below none", "", apply({0, 1}, {-1, 1}), "restFrames", {-1, 1}},
        {"offset", "", apply({0, 1}, {0, 0}), "topology restFrames", {0, 0}},
        {"surface and smoothing", "", apply({0, 0}, {1, 1}), "topology connections restFrames", {1, 1}},
        {"a mode that is none", "", apply({2, 0}, {2, 7}), "topology restFrames", {2, 7}},
        {"lowers nothing", "connections", apply({3, 1}, {3, 1}), "connections", {3, 1}},
        {"export on", "", exportMode(true), "topology connections restFrames export", {2, 0}},
        {"export off", "export", exportMode(false), "connections restFrames", {5, 1}},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        neuralWarpData data;
        stateText::raise(data, row.before);
        data.cacheVersions = {4, 5, 6, 7, 8};
        row.operation(data);
        EXPECT_EQ(raised(data), row.after);
        EXPECT_TRUE(data.activeSettings == row.active);
        EXPECT_THAT(data.cacheVersions, ElementsAre(4, 5, 6, 7, 8));
    }
}

void fillCaches(neuralWarpData& data) {
    const ZooMesh grid = makeGrid(2, 2);
    data.componentMap.setIdentity(grid.vertexCount());
    data.vertexFrames.build(grid.topology(), data.componentMap, &grid.points);
    data.vertexConnections.build(grid.topology(), data.componentMap, 0, false);
    data.vertexConnections.calculateConnectionWeights(data.connectionWeights, grid.points, 1.0, 0.0);
    data.restFramesInverse.resize(grid.vertexCount());
}

// --- the affect map ---

TEST(AffectMap, IsOfTheSubsetThatTheMetadataSay) {
    struct Row {
        SubsetState state;
        bool useAffectMap;
        Indices affectMap, affectedVertices;
        std::size_t slots; ///< how many the network has to give
    };
    for (const Row& row : {Row{SubsetState::Complete, false, {}, {}, 6},
                           {SubsetState::Partial, true, {none, none, 1, none, 0, none}, {2, 4}, 2},
                           {SubsetState::Empty, true, {}, {}, 0},
                           {SubsetState::Unrecognized, true, {}, {}, 0}}) {
        SCOPED_TRACE(static_cast<int>(row.state));
        neuralWarpData data;
        data.componentMap.setIdentity(6);
        data.metadata.fullCount = 6;
        data.metadata.subsetState = row.state;
        data.metadata.affectMap = {4, 2};
        data.affectMap = data.affectedVertices = {77, 88, 99};
        data.modelValid = true;
        data.buildAffectMap();
        EXPECT_EQ(data.useAffectMap, row.useAffectMap);
        EXPECT_EQ(data.affectMap, row.affectMap);
        EXPECT_EQ(data.affectedVertices, row.affectedVertices);
        EXPECT_EQ(data.slotCount(), row.slots);
        EXPECT_EQ(data.drivesNothing(), row.useAffectMap && row.affectMap.empty());
        EXPECT_THAT(data.cacheVersions, ElementsAre(never, never, never, 0, never));
    }
}

TEST(AffectMap, OfAnInvalidModelIsEmptiedAndNotBuilt) {
    neuralWarpData data;
    data.componentMap.setIdentity(3);
    data.affectMap = data.affectedVertices = {0, 1};
    data.useAffectMap = true;
    data.buildAffectMap();
    EXPECT_THAT(data.affectMap, IsEmpty());
    EXPECT_THAT(data.affectedVertices, IsEmpty());
    EXPECT_TRUE(data.useAffectMap);
    EXPECT_EQ(data.cacheVersions[neuralWarpData::affectMapCache], 0U);
    // the map has no entry for any of the vertices
    for (const std::size_t i : {std::size_t{0}, std::size_t{2}, std::size_t{1} << 40U})
        EXPECT_FALSE(data.isVertexAffected(i));
}

// --- copying ---

class OtherData : public HPxData {
public:
    void copy(const HPxData&) override {}
    HTypeId typeId() const override { return {0x58000971}; }
    HString name() const override { return "other"; }
};

TEST(Copy, TakesTheModelAndKeepsWhatWasMeasured) {
    const TemporaryFolder folder;
    writeModel(folder.path() / "model.nwrp", {});
    neuralWarpData source;
    fillCaches(source);
    stateText::raise(source, "topology indexMap connections load metadata path applied export valid affectMap");
    source.multiIndex = 3;
    source.affectMap = {none, 4};
    source.affectedVertices = {1};
    source.mappedSlotCount = 5;
    source.restPoints.resize(2);
    source.principalShapes = {1, 2, 3};
    source.principalShapeCount = source.principalVertCount = 1;
    source.modelRootPath = folder.path();
    source.modelDirectory = folder.path() / "model.nwrp";
    ASSERT_EQ(source.session.load(source.modelDirectory / "model.onnx", true), LoadResult::Loaded);
    source.metadata.componentTagExpression = "part";
    source.activeSettings = {1, 0};
    source.modelSettings = {2, 0};
    source.exportSettings = {3, 0};
    source.cacheVersions.assign(5, 9);

    neuralWarpData copied;
    stateText::raise(copied, "restFrames");
    copied.copy(OtherData());
    EXPECT_EQ(raised(copied), "restFrames");
    EXPECT_EQ(copied.multiIndex, 0U);

    copied.copy(source);
    EXPECT_EQ(raised(copied), "topology indexMap connections restFrames load metadata path export valid affectMap");
    EXPECT_EQ(copied.multiIndex, 3U);
    EXPECT_EQ(copied.componentMap.affectCount(), 9U);
    EXPECT_EQ(copied.vertexFrames.framesPairs(), source.vertexFrames.framesPairs());
    EXPECT_EQ(copied.vertexFrames.framesIndexer(), source.vertexFrames.framesIndexer());
    EXPECT_EQ(copied.vertexConnections.connections(), source.vertexConnections.connections());
    EXPECT_EQ(copied.connectionWeights, source.connectionWeights);
    EXPECT_EQ(copied.affectMap, source.affectMap);
    EXPECT_EQ(copied.affectedVertices, source.affectedVertices);
    EXPECT_EQ(copied.slotCount(), 5U);
    EXPECT_EQ(copied.principalShapes, source.principalShapes);
    EXPECT_EQ(copied.principalShapeCount, 1U);
    EXPECT_EQ(copied.principalVertCount, 1U);
    EXPECT_EQ(copied.modelDirectory, source.modelDirectory);
    EXPECT_EQ(copied.metadata.componentTagExpression, "part");
    EXPECT_TRUE(copied.activeSettings == source.activeSettings);
    EXPECT_TRUE(copied.modelSettings == source.modelSettings);
    EXPECT_TRUE(copied.exportSettings == source.exportSettings);
    EXPECT_TRUE(copied.canApplyModel());
    EXPECT_EQ(copied.session.run(std::vector<float>{0}), std::vector<float>{1});
    // what stays
    EXPECT_THAT(copied.restPoints, IsEmpty());
    EXPECT_THAT(copied.restFramesInverse, IsEmpty());
    EXPECT_TRUE(copied.modelRootPath.empty());
    EXPECT_THAT(copied.cacheVersions, testing::Each(never));

    // a directory that was written into since: the network need not be the one of the rest
    source.setModelPathDirty(false);
    source.metadataDirty = source.modelLoadPending = false;
    source.directoryState = neuralWarp::DirectoryState::atRest(source.modelDirectory);
    copied.copy(source);
    EXPECT_FALSE(copied.modelPathDirty);
    writeFile(source.modelDirectory / "principal_shapes.json", "{}");
    copied.copy(source);
    EXPECT_TRUE(copied.modelPathDirty && copied.metadataDirty && copied.modelLoadPending);

    // a model that has gone is not carried on
    std::filesystem::remove_all(source.modelDirectory);
    copied.copy(source);
    EXPECT_FALSE(copied.canApplyModel());
}

// --- published buffers ---

class Buffers : public WarpTest {};

TEST_F(Buffers, AreCopiesOfTheCachesByTheirExactNames) {
    ModelSpec spec;
    spec.bias = {1, 2};
    spec.shapes = {std::vector<float>(6, 0.5F), std::vector<float>(6, 0.25F)};
    spec.smoothingIterations = 2;
    spec.fullCount = 9;
    spec.affectCount = 2;
    spec.subsetState = "partial";
    spec.affectMap = {7, 2};
    writeModel(modelDirectory(), spec);
    warpRig::Rig rig;
    rig.addGeometry(0, {.mesh = warpRig::mesh(makeGrid(2, 2))});
    rig.setModelRoot(folder.path());
    rig.setControls({1});
    ASSERT_EQ(rig.deform(0), HStatus::kSuccess);
    EXPECT_THAT(takeMessages(), testing::SizeIs(2)); // another vertex set than trained, and another count
    const neuralWarpData& state = *rig.state(0);
    auto& node = dynamic_cast<neuralWarpNode&>(*HFnDependencyNode(rig.node).userNode());

    const HObject sync = node.getNamedBuffer("Sync", 0);
    const TuInt32Array* versions = TapiCastAnim::uInt32Array(sync);
    ASSERT_TRUE(versions);
    EXPECT_EQ(Indices(versions->begin(), versions->end()), state.cacheVersions);
    const HObject shapes = node.getNamedBuffer("PrincipalShapesData", 0);
    const TfloatArray* basis = TapiCastAnim::floatArray(shapes);
    ASSERT_TRUE(basis && basis->length() == 12);
    EXPECT_EQ(std::vector<float>(basis->begin(), basis->end()), state.principalShapes);
    const HObject vertices = node.getNamedBuffer("OriginalVerts", 0);
    const T3dFltVectorArray* points = TapiCastAnim::floatVectorArray(vertices);
    ASSERT_TRUE(points && points->length() == 9);
    EXPECT_EQ((*points)[5].y, state.restPoints[5].y);
    const HObject inverses = node.getNamedBuffer("SmoothOriginalFramesInverse", 0);
    const T4dDblMatrixArray* matrices = TapiCastAnim::doubleMatrixArray(inverses);
    ASSERT_TRUE(matrices && matrices->length() == 9);
    EXPECT_EQ((*matrices)[4][3][1], state.restFramesInverse[4](3, 1));

    for (const char* name : {"sync", "SYNC", "Sync ", "", "framesPairs", "Frames"})
        EXPECT_TRUE(node.getNamedBuffer(name, 0).isNull()) << name;
    EXPECT_TRUE(node.getNamedBuffer("Sync", 1).isNull());
}

} // namespace
