// SPDX-License-Identifier: Apache-2.0
#include "ScenarioObservation.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HPxDeformerNode.h"
#include "openquarn/TapiCastAnim.h"

#include <array>

namespace replay {
namespace {

using neuralWarp::neuralWarpData;

constexpr std::array bufferNames = {"Sync",
                                    "FramesIndexer",
                                    "FramesPairs",
                                    "Connections",
                                    "ConnectionsIndexer",
                                    "ConnectionWeights",
                                    "AffectToDeltaMap",
                                    "OriginalVerts",
                                    "SmoothOriginalFramesInverse",
                                    "PrincipalShapesData"};

template <class Element>
std::vector<Element> elementsOf(const TArray<Element>& array) {
    return {array.begin(), array.end()};
}

Json vectorsToJson(const T3dFltVectorArray& vectors, JsonAllocator& allocator) {
    std::vector<quill::val3<float>> converted;
    for (const T3dFltVector& v : vectors)
        converted.emplace_back(v.x, v.y, v.z);
    return toJson(converted, allocator);
}

Json matricesToJson(const T4dDblMatrixArray& matrices, JsonAllocator& allocator) {
    std::vector<quill::mat4d> converted(matrices.length());
    for (std::size_t i = 0; i < converted.size(); ++i)
        for (unsigned k = 0; k < 16; ++k)
            converted[i].m[k] = matrices[i](k / 4, k % 4);
    return toJson(converted, allocator);
}

// null for the null object
Json bufferToJson(const HObject& buffer, JsonAllocator& allocator) {
    if (const auto* integers = TapiCastAnim::uInt32Array(buffer))
        return toJson(elementsOf(*integers), allocator);
    if (const auto* floats = TapiCastAnim::floatArray(buffer))
        return toJson(elementsOf(*floats), allocator);
    if (const auto* vectors = TapiCastAnim::floatVectorArray(buffer))
        return vectorsToJson(*vectors, allocator);
    if (const auto* matrices = TapiCastAnim::doubleMatrixArray(buffer))
        return matricesToJson(*matrices, allocator);
    return {};
}

Json buffersToJson(const ScenarioScene& scene, unsigned index, JsonAllocator& allocator) {
    auto* deformer = dynamic_cast<HPxDeformerNode*>(HFnDependencyNode(scene.rig().node).userNode());
    Output out(allocator);
    for (const char* name : bufferNames)
        out.set(name, bufferToJson(deformer->getNamedBuffer(name, index), allocator));
    return out.take();
}

Json flagsToJson(const neuralWarpData& state, JsonAllocator& allocator) {
    Output out(allocator);
    out.set("framesTopologyDirty", state.framesTopologyDirty);
    out.set("indexMapDirty", state.indexMapDirty);
    out.set("connectionsDirty", state.connectionsDirty);
    out.set("restFramesDirty", state.restFramesDirty);
    out.set("modelApplied", state.modelApplied);
    out.set("exportMode", state.exportMode);
    out.set("modelLoadPending", state.modelLoadPending);
    out.set("metadataDirty", state.metadataDirty);
    out.set("modelPathDirty", state.modelPathDirty);
    out.set("modelValid", state.modelValid);
    out.set("useAffectMap", state.useAffectMap);
    return out.take();
}

Json settingsToJson(const neuralWarp::DeltaSettings& settings, JsonAllocator& allocator) {
    Json pair(rapidjson::kArrayType);
    pair.PushBack(Json(settings.smoothingIterations), allocator);
    pair.PushBack(Json(settings.deltaMode), allocator);
    return pair;
}

} // namespace

int observedStatus(const HStatus& status) {
    if (!status.error())
        return HStatus::kSuccess;
    return status == HStatus::kInvalidParameter ? HStatus::kInvalidParameter : HStatus::kFailure;
}

Json observePositions(const ScenarioScene& scene, unsigned index, JsonAllocator& allocator) {
    std::vector<quill::val3<double>> converted;
    for (const HPoint& p : scene.rig().result(index))
        converted.emplace_back(p.x, p.y, p.z);
    return toJson(converted, allocator);
}

void observeGeometry(Output& out, const ScenarioScene& scene, unsigned index, JsonAllocator& allocator) {
    const neuralWarpData& state = *scene.rig().state(index); // deform() has seen to it that there is one
    out.set("positions", observePositions(scene, index, allocator));
    out.set("flags", flagsToJson(state, allocator));
    out.set("activeSettings", settingsToJson(state.activeSettings, allocator));
    out.set("modelOutputs", scene.modelOutputs());
    out.set("affectedVertices", state.affectedVertices);
    out.set("buffers", buffersToJson(scene, index, allocator));
}

} // namespace replay
