// SPDX-License-Identifier: Apache-2.0
#include "deformer/neuralWarpData.h"

#include "nw_deform/Model.h"

#include <utility>

namespace neuralWarp {

const HTypeId neuralWarpData::id{0x58000972};
const HString neuralWarpData::typeName("neuralWarpData");

HPxData* neuralWarpData::create() {
    return new neuralWarpData;
}

HTypeId neuralWarpData::typeId() const {
    return id;
}

HString neuralWarpData::name() const {
    return typeName;
}

void neuralWarpData::copy(const HPxData& source) {
    if (source.typeId() != id || &source == this)
        return;
    const auto& other = static_cast<const neuralWarpData&>(source);
    multiIndex = other.multiIndex;
    framesTopologyDirty = other.framesTopologyDirty;
    vertexFrames = other.vertexFrames;
    indexMapDirty = other.indexMapDirty;
    componentMap = other.componentMap;
    connectionsDirty = other.connectionsDirty;
    vertexConnections = other.vertexConnections;
    connectionWeights = other.connectionWeights;
    principalShapes = other.principalShapes;
    principalShapeCount = other.principalShapeCount;
    principalVertCount = other.principalVertCount;
    modelDirectory = other.modelDirectory;
    modelPathDirty = other.modelPathDirty;
    modelLoadPending = other.modelLoadPending;
    metadataDirty = other.metadataDirty;
    modelValid = other.modelValid;
    metadata = other.metadata;
    activeSettings = other.activeSettings;
    modelSettings = other.modelSettings;
    exportSettings = other.exportSettings;
    exportMode = other.exportMode;
    affectMap = other.affectMap;
    useAffectMap = other.useAffectMap;
    affectedVertices = other.affectedVertices;
    mappedSlotCount = other.mappedSlotCount;
    directoryState = other.directoryState;
    workspace.invalidate();
    session.load(other.session.modelPath(), true);
    if (isReplaced())
        setModelPathDirty(true); // the network may be of another model than the rest
}

void neuralWarpData::markAllDirty() {
    framesTopologyDirty = true;
    indexMapDirty = true;
    connectionsDirty = true;
    restFramesDirty = true;
    setModelPathDirty(true);
}

void neuralWarpData::setModelPathDirty(bool isDirty) {
    modelPathDirty = isDirty;
    if (isDirty) {
        modelLoadPending = true;
        metadataDirty = true;
    }
}

void neuralWarpData::applySettings(const DeltaSettings& requested) {
    if (requested.deltaMode != activeSettings.deltaMode) {
        framesTopologyDirty = true;
        restFramesDirty = true;
    }
    if (requested.isSmoothed() != activeSettings.isSmoothed()) {
        connectionsDirty = true;
        restFramesDirty = true;
    }
    if (requested.smoothingIterations != activeSettings.smoothingIterations)
        restFramesDirty = true;
    activeSettings = requested;
}

void neuralWarpData::setExportMode(bool on) {
    exportMode = on;
    applySettings(on ? exportSettings : modelSettings);
}

void neuralWarpData::releaseUnusedCaches() {
    if (!activeSettings.isSmoothed() && !vertexConnections.connectionsIndexer().empty()) {
        vertexConnections = {};
        connectionWeights = {};
        bump(connectionsCache);
        workspace.invalidate();
    }
    if (!activeSettings.isSurface() && !vertexFrames.framesPairs().empty()) {
        vertexFrames = {};
        restFramesInverse = {};
        bump(framesCache);
        bump(restFramesCache);
        workspace.invalidate();
    }
}

bool neuralWarpData::hasDueCaches() const {
    return indexMapDirty || ((framesTopologyDirty || restFramesDirty) && activeSettings.isSurface()) ||
           (connectionsDirty && activeSettings.isSmoothed());
}

bool neuralWarpData::canApplyModel() const {
    return session.lastResult() == LoadResult::Loaded && session.isLoaded() && modelValid;
}

FrameModel neuralWarpData::frameModel() const {
    return {.settings = activeSettings,
            .vertexCount = componentMap.affectCount(),
            .driven = driven(),
            .slotCount = slotCount(),
            .shapes = {principalShapes, principalShapeCount, principalVertCount},
            .rest = {vertexConnections, connectionWeights, vertexFrames, restPoints, restFramesInverse}};
}

void neuralWarpData::buildAffectMap() {
    affectMap.clear();
    affectedVertices.clear();
    mappedSlotCount = 0;
    workspace.invalidate();
    bump(affectMapCache);
    if (!modelValid)
        return;
    SlotMap map = mapSlots(trainedVertices(metadata), componentMap);
    useAffectMap = !map.isIdentity;
    affectMap = std::move(map.slots);
    affectedVertices = std::move(map.vertices);
    mappedSlotCount = map.slotCount;
}

} // namespace neuralWarp
