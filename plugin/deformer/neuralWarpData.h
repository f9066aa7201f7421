// SPDX-License-Identifier: Apache-2.0
// What the deformer knows of one geometry from one evaluation to the next.
#pragma once

#include "frame/FrameModel.h"
#include "frame/FrameObserver.h"
#include "frame/FrameWorkspace.h"
#include "nw_model/DirectoryState.h"
#include "nw_model/ModelMetadata.h"
#include "nw_model/ModelSession.h"
#include "openquarn/HPxData.h"
#include "quill/IndexMapper.h"
#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"
#include "quill/mat4d.h"

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <vector>

namespace neuralWarp {

/// The state of one deformed geometry, held in the element of the node's attribute `deformerData` that has the
/// geometry's index. Flags say what must be made again; whoever makes it clears them. The counters in cacheVersions say
/// to readers of the published buffers that there is a new one.
///
/// Nothing is locked: one thread at a time, the one that evaluates the geometry or runs a command. Parallel loops only
/// read it.
class neuralWarpData final : public HPxData {
public:
    static const HTypeId id;
    static const HString typeName;
    static HPxData* create();

    /// Throws what ModelSession() throws.
    neuralWarpData() = default;

    /// Takes over the settings, the maps, the topology caches and the model, which is loaded again from its file; what
    /// is measured on the rest points stays, and so do the counters. Does nothing for data of another type.
    void copy(const HPxData& source) override;
    HTypeId typeId() const override;
    HString name() const override;

    /// Raises every flag.
    void markAllDirty();
    /// With true, the metadata and the model become due as well.
    void setModelPathDirty(bool isDirty);
    /// Puts settings in force, and raises the flags of the caches that do not suit them.
    void applySettings(const DeltaSettings& requested);
    void setExportMode(bool on);
    /// Empties the caches that the settings in force have no use for.
    void releaseUnusedCaches();
    /// The network can be run, and was trained on this geometry.
    bool canApplyModel() const;
    /// Some rest cache is due, and the settings in force have a use for it.
    bool hasDueCaches() const;
    /// A load was asked for since the last evaluation on the CPU: one that it left due is not tried again by itself.
    bool hasNewLoads() const { return (loadsDue() & ~loadsLeft) != 0; }
    /// An evaluation on the CPU ends here. One that gave the model up before all loads were made goes on with them in
    /// the next: they count as asked for anew.
    void leaveLoads(bool isGivenUp) { loadsLeft = isGivenUp ? 0 : loadsDue(); }
    /// The model is in use and drives none of the deformed vertices.
    bool drivesNothing() const { return useAffectMap && affectMap.empty(); }
    /// The model drives deformed vertex `i`. False for an index that no vertex has.
    bool isVertexAffected(std::size_t i) const { return driven().contains(i); }
    /// The vertices that the model drives. A view of this object.
    DrivenVertices driven() const {
        return useAffectMap ? DrivenVertices(affectedVertices, affectMap) : DrivenVertices(componentMap.affectCount());
    }
    /// What a frame is computed through, with the settings in force. Views of this object.
    FrameModel frameModel() const;
    /// Compares the vertices of the metadata with componentMap; empties the map and goes no further unless modelValid.
    void buildAffectMap();

    /// Slots of cacheVersions.
    enum Cache : std::size_t { framesCache, connectionsCache, restFramesCache, affectMapCache, principalShapesCache };
    void bump(Cache cache) { bumpVersion(cacheVersions[cache]); }
    /// The next version: never 0xFFFFFFFF, which means that there was none yet.
    static void bumpVersion(std::uint32_t& version) { version = version == 0xFFFFFFFE ? 0 : version + 1; }

    bool framesTopologyDirty = true; ///< vertexFrames must be built
    bool indexMapDirty = true;       ///< componentMap must be taken over from the host
    bool connectionsDirty = true;    ///< vertexConnections and connectionWeights must be built
    bool restFramesDirty = true;     ///< restFramesInverse must be computed
    bool modelApplied = false;       ///< the last evaluation on the CPU applied the model
    bool exportMode = false;         ///< training data is being exported: the geometry is left as it is
    bool modelLoadPending = true;    ///< network and principal shapes must be loaded
    bool metadataDirty = true;       ///< the metadata must be read
    bool modelPathDirty = true;      ///< the model directory must be resolved
    bool modelValid = false;         ///< the metadata suits the geometry
    bool useAffectMap = false;       ///< the model's vertices are not the deformed ones: affectMap is in force
    std::uint32_t multiIndex = 0;    ///< the geometry's index

    quill::VertexFrames vertexFrames;
    quill::VertexConnections vertexConnections;
    quill::SharedArray<float> connectionWeights; ///< parallel to vertexConnections.connections()
    quill::IndexMapper componentMap;             ///< the deformed vertices, in the host's order
    /// For each deformed vertex the model slot that drives it, or missingIndex. Empty unless useAffectMap.
    std::vector<std::uint32_t> affectMap;
    std::vector<std::uint32_t>
        affectedVertices; ///< the deformed vertices that a slot drives, ascending; empty as above
    quill::SharedArray<quill::val3<float>> restPoints;  ///< unsmoothed, object space
    quill::SharedArray<quill::mat4d> restFramesInverse; ///< inverted frames of the smoothed rest surface
    PrincipalBasis principalShapes;                     ///< principalVertCount slots of principalShapeCount shapes
    std::uint64_t principalShapeCount = 0;
    std::uint64_t principalVertCount = 0;
    std::filesystem::path modelRootPath;
    std::filesystem::path modelDirectory; ///< empty: no model directory is resolved
    ModelSession session;
    ModelMetadata metadata;
    /// The model directory when the metadata were read, if they could be: what is loaded later is of the same model
    /// only while the directory is the same.
    std::optional<DirectoryState> directoryState;
    bool isReplaced() const { return directoryState && !directoryState->isStillThatOf(modelDirectory); }
    DeltaSettings activeSettings; ///< in force
    DeltaSettings modelSettings;  ///< what the metadata asks for
    DeltaSettings exportSettings; ///< what the export attributes ask for
    std::vector<std::uint32_t> cacheVersions = std::vector<std::uint32_t>(5, 0xFFFFFFFF);

    /// The flags of the three loads, one bit each, and those that the last evaluation on the CPU left raised.
    unsigned loadsDue() const {
        return (modelPathDirty ? 1U : 0U) | (metadataDirty ? 2U : 0U) | (modelLoadPending ? 4U : 0U);
    }
    unsigned loadsLeft = 0;

    /// How many slots of the model are read: the highest in use + 1. Follows componentMap and affectMap.
    std::size_t slotCount() const { return useAffectMap ? mappedSlotCount : componentMap.affectCount(); }
    std::size_t mappedSlotCount = 0;

    /// What the frames of this geometry are computed in. Invalidated by whoever changes what frameModel() views.
    FrameWorkspace workspace;

    /// Hears of each evaluation, on the CPU and on the GPU. Not owned, never null.
    FrameObserver* observer = &FrameObserver::none();
};

} // namespace neuralWarp
