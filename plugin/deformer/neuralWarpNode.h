// SPDX-License-Identifier: Apache-2.0
// The deformer: moves each of its geometries by the output of a trained network.
#pragma once

#include "deformer/TargetDeltaType.h"
#include "deformer/neuralWarpData.h"
#include "openquarn/HDoubleArray.h"
#include "openquarn/HNodeMessage.h"
#include "openquarn/HPxDeformerNode.h"

#include <cstdint>
#include <vector>

namespace neuralWarp {

struct Blend;
enum class Attempt;

/// What is kept of a geometry between evaluations is a neuralWarpData, in the element of `deformerData` that has the
/// geometry's index. docs/neuralWarp.md lists the attributes.
///
/// Operations on one geometry may run beside those on another. Failures of host calls are reported (HStatus::pAPIerror)
/// and returned; what the user has to know is shown, and the status is then a failure too.
class neuralWarpNode final : public HPxDeformerNode {
public:
    static const HTypeId id;
    static const HString typeName;
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    neuralWarpNode();
    ~neuralWarpNode() override;

    // --- what the host calls ---

    /// Sets the default folders, below the root of the workspace, unless a scene file is being read. [main]
    void postConstructor() override;
    /// The model root, when there is one. [main]
    HStringArray getFilesToArchive(bool shortName, bool unresolvedName, bool markCouldBeImageSequence) const override;
    void getExternalContent(HExternalContentInfoTable& table) const override;
    void setExternalContent(const HExternalContentLocationTable& table) override;
    /// Makes the geometry's neuralWarpData when it has none; with `reset`, everything it holds is made again. [eval]
    HStatus initializeMultiIndex(HDataBlock& block, unsigned multiIndex, bool reset) override;
    /// Applies model and target morph to one geometry. [eval]
    HStatus deform(HDataBlock& block, HItGeometry& iterator, const HMatrix& localToWorld, unsigned multiIndex) override;
    /// A copy of one of the geometry's buffers, by its name (namedBuffers.h); null without such a name or geometry.
    /// [eval]
    HObject getNamedBuffer(const HString& name, unsigned multiIndex) override;
    /// What decides whether the model is applied, which the GPU deformer takes from the last evaluation on the CPU.
    /// [eval]
    void primingAttributes(HObjectArray& attributes) const override;
    /// A reload or other settings were asked for since the last evaluation on the CPU. [eval]
    bool isDueOnCpu(HDataBlock& block, unsigned multiIndex) override;

    // --- what the command calls ---

    /// Describes the model of a geometry: "{'rootPath' : 'R' ,'modelPath' : 'D'}". `text` is emptied first. Resolves
    /// the model directory when that is due. Fails with kFailure, in silence, for a geometry without state. [main]
    HStatus describeModel(std::uint32_t multiIndex, HString& text);
    /// Puts the export attributes of a geometry in force, and has evaluations leave it as it is; false: back to the
    /// model's settings. kInvalidParameter for a geometry without state. [main]
    HStatus setExportActive(std::uint32_t multiIndex, bool active);
    /// Has the model of a geometry loaded again in the next evaluation. kFailure for a geometry without state. [main]
    HStatus requestReload(std::uint32_t multiIndex);
    /// Training deltas of a geometry against its target, with the settings in force.
    /// `out` replaced on success: x, y, z of each affected vertex, in affected order; empty when the target has fewer
    /// vertices than the geometry. kInvalidParameter for `invalid` and for a geometry without state. [main]
    HStatus getVertexDeltas(HDoubleArray& out, std::uint32_t multiIndex, TargetDeltaType type);

    // --- frames ---

    /// frames[i] = the frame of vertex i on `positions`, or its inverse; of the vertices in `subset`, all when null.
    /// `frames` grows to the number of affected vertices. [eval]
    void calculateVertexFrames(const neuralWarpData& data, std::vector<quill::mat4d>& frames, const Points& positions,
                               bool invert, const std::vector<std::uint32_t>* subset) const;
    /// The same on another topology than the state's.
    void calculateVertexFrames(const quill::VertexFrames& topology, const quill::IndexMapper& map,
                               std::vector<quill::mat4d>& frames, const Points& positions, bool invert,
                               const std::vector<std::uint32_t>* subset) const;
    /// out[i] = in[i] transformed as a point by frames[i], for the vertices in `subset`, all when null; `out` gets as
    /// many elements as the geometry has affected vertices. Vertices beyond `in` or `frames` are left out. [eval]
    HStatus applyVertexFrames(Points& out, const Points& in, const std::vector<quill::mat4d>& frames,
                              std::uint32_t multiIndex, const std::vector<std::uint32_t>* subset) const;

    // --- attributes ---

    static inline HObject modelRoot;
    static inline HObject modelName;
    static inline HObject modelActive;
    static inline HObject models;
    static inline HObject trainingDataRoot;
    static inline HObject trainingDataName;
    static inline HObject deltaMode;
    static inline HObject smoothingIterations;
    static inline HObject exportStartFrame;
    static inline HObject exportEndFrame;
    static inline HObject exportList; ///< "export"
    static inline HObject outputModelName;
    static inline HObject batchSize;
    static inline HObject epochs;
    static inline HObject learningRate;
    static inline HObject validationRatio;
    static inline HObject hiddenLayerCount;
    static inline HObject neuronsPerLayer;
    static inline HObject activationFunction;
    static inline HObject dropoutRatio;
    static inline HObject principalShapesEnabled;
    static inline HObject principalShapesLimit;
    static inline HObject principalShapesAccuracy;
    static inline HObject preloadData;
    static inline HObject train;
    static inline HObject controlValues;
    static inline HObject targetGeometry;
    static inline HObject targetMorphGeometry;
    static inline HObject targetMorphEnabled;
    static inline HObject targetMorphEnvelope;
    static inline HObject poseGenerator;
    static inline HObject deformerData;

private:
    static void attributeChanged(int mask, HPlug& plug, HPlug& otherPlug, void* clientData);
    void raiseReloadFlags();

    // Loading a model, in this order. Each does its work only when its flag says so (or `force`), clears the flag
    // before, and is not tried again by itself. The directory is to be the same from the metadata to the last file:
    // when it is not, loadModel() fails in silence with all flags raised.
    HStatus resolveModelDirectory(HDataBlock& block, neuralWarpData& data);
    HStatus loadMetadata(neuralWarpData& data, bool force);
    HStatus loadModel(neuralWarpData& data, bool force);
    HStatus validateModel(neuralWarpData& data);
    /// The first two as far as they are due, and the model's settings put in force. False: no model in this evaluation.
    bool updateModelSettings(HDataBlock& block, neuralWarpData& data);
    /// loadModel(), from the directory on while that is replaced or written into, a few times; then it says so. Fails
    /// only when the rest caches do.
    HStatus loadWholeModel(HDataBlock& block, neuralWarpData& data);

    // Geometry into affected index space.
    HStatus prepareRestState(neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex);
    HStatus readTargetPoints(const neuralWarpData& data, std::uint32_t multiIndex, Points& points);
    bool readTargetMorph(HDataBlock& block, std::uint32_t multiIndex, double& morphEnvelope, Points& points,
                         HStatus& status);
    HStatus readInputPoints(const neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex, Points& points,
                            bool smooth);
    HStatus readSmoothedRestPoints(const neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex,
                                   Points& points, bool smooth);

    // Evaluation.
    struct TargetMorph;
    HStatus evaluate(HDataBlock& block, HItGeometry& iterator, std::uint32_t multiIndex);
    /// Up to the decision whether the model is applied, which goes into the state.
    HStatus prepare(HDataBlock& block, std::uint32_t multiIndex, neuralWarpData& data, bool isActive,
                    TargetMorph& morph, Attempt& attempt);
    HStatus applyNeuralModel(HDataBlock& block, std::uint32_t multiIndex, neuralWarpData& data, Points& result);
    HStatus writeBlended(HDataBlock& block, HItGeometry& iterator, std::uint32_t multiIndex, neuralWarpData& data,
                         const Blend& blend);

    HCallbackId attributeCallback_ = 0;
};

} // namespace neuralWarp
