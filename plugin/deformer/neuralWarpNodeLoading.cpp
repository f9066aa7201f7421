// SPDX-License-Identifier: Apache-2.0
// From the attributes of the node to a loaded model.
#include "deformer/geometryReaders.h"
#include "deformer/neuralWarpNode.h"
#include "deformer/neuralWarpUtils.h"
#include "messages/displayErrorGated.h"
#include "messages/guard.h"
#include "messages/messageText.h"
#include "messages/sourceUnits.h"
#include "nw_deform/BasisSink.h"
#include "openquarn/HGlobal.h"
#include "openquarn/HItGeometry.h"
#include "openquarn/HLongWork.h"
#include "openquarn/Instrumenter.h"

#include <system_error>

namespace neuralWarp {
namespace {

namespace fs = std::filesystem;

/// What is at a path. A disk that cannot answer is a failure that names the path and the reason, and not a missing
/// entry: the user would look for a file that is there.
struct Entry {
    explicit Entry(const fs::path& path) {
        std::error_code error;
        type = fs::status(path, error).type();
        if (type == fs::file_type::none)
            status = {HStatus::kFailure, "'" + path.string() + "' cannot be looked up: " + error.message()};
    }
    bool exists() const { return type != fs::file_type::not_found && type != fs::file_type::none; }
    bool isDirectory() const { return type == fs::file_type::directory; }

    fs::file_type type = fs::file_type::none;
    HStatus status; ///< a failure when the question could not be answered
};

HStatus badPath(const HString& path) {
    raiseMessage<Text::kErrorMlNodeBadModelPath>(displayErrorGated, path);
    return {HStatus::kFailure, "there is no such model directory"};
}

HStatus noPath() {
    raiseMessage<Text::kErrorMlNoModelPath>(displayErrorGated);
    return {HStatus::kFailure, "modelRoot or modelName is empty"};
}

HString modelNameIn(const HDataHandle& element) {
    return element.child(neuralWarpNode::modelName).asString();
}

/// Fills modelRootPath and modelDirectory.
HStatus findModelDirectory(HDataBlock& block, neuralWarpData& data) {
    HStatus status;
    const HString rootText = block.inputValue(neuralWarpNode::modelRoot, &status).asString();
    if (status.error())
        return reported(status, sourceUnit::node);
    if (rootText.isEmpty())
        return noPath();
    const fs::path root(rootText.asStdString());
    const Entry rootEntry(root);
    if (rootEntry.status.error())
        return reported(rootEntry.status, sourceUnit::node);
    if (!rootEntry.exists())
        return badPath(rootText);
    data.modelRootPath = root;

    const HDataHandle element = existingElement(block, neuralWarpNode::models, data.multiIndex, status);
    if (status.error())
        return reported(status, sourceUnit::node);
    const HString nameText = modelNameIn(element);
    if (nameText.isEmpty())
        return noPath();
    const fs::path directory = (root / nameText.asStdString()).replace_extension(".nwrp");
    const Entry entry(directory);
    if (entry.status.error())
        return reported(entry.status, sourceUnit::node);
    if (!entry.isDirectory())
        return badPath(directory.string());
    data.modelDirectory = directory;
    return HStatus::kSuccess;
}

void showLoadResult(LoadResult result, const fs::path& file) {
    if (result == LoadResult::Loaded)
        Instrumenter::with("QUARN.NEURAL_WARP_LOADED_MODEL").instrument();
    else if (result == LoadResult::NotFound)
        raiseMessage<Text::kErrorMlNodeBadModelPath>(displayErrorGated, file);
    else if (result == LoadResult::NotRecognized)
        raiseMessage<Text::kErrorMlModelNotRecognized>(displayErrorGated);
}

void clearPrincipalShapes(neuralWarpData& data) {
    data.principalShapes.clear();
    data.principalShapeCount = 0;
    data.principalVertCount = 0;
    data.bump(neuralWarpData::principalShapesCache);
}

/// The directory is not the one any more of which the metadata are: nothing is applied, and everything is due again.
HStatus dueAgain(neuralWarpData& data) {
    data.modelValid = false;
    clearPrincipalShapes(data);
    data.setModelPathDirty(true);
    return HStatus::kFailure;
}

HStatus loadNetwork(neuralWarpData& data) {
    const fs::path file = data.modelDirectory / "model.onnx";
    const LoadResult result = data.session.load(file, true);
    if (data.isReplaced())
        return dueAgain(data); // whatever came of it
    showLoadResult(result, file);
    if (data.session.isLoaded())
        return HStatus::kSuccess;
    raiseMessage<Text::kErrorMLModelInit>(displayErrorGated, data.multiIndex);
    const std::string& reason = data.session.errorText();
    if (reason.empty())
        return HStatus::kFailure;
    return reported({HStatus::kFailure, "'" + file.string() + "' cannot be used: " + reason}, sourceUnit::node);
}

/// None when the directory has no such file, or a bad one.
HStatus loadPrincipalShapes(neuralWarpData& data) {
    const Entry entry(data.modelDirectory / "principal_shapes.json");
    if (!entry.exists())
        return entry.status;
    BasisSink sink(data.principalShapes);
    PrincipalShapesAnswer answer;
    if (readPrincipalBasis(data.modelDirectory, sink, answer)) {
        data.principalShapeCount = answer.shapeCount;
        data.principalVertCount = answer.vertCount;
        data.principalShapes.share();
    } else {
        data.principalShapes.clear();
    }
    return entry.status;
}

/// A model that smooths for long is in force from now on: the user is told before the first frame (decision 0123).
void announceSmoothing(HDataBlock& block, const neuralWarpData& data, const HString& nodeName) {
    constexpr std::int64_t manyPasses = 1000;
    const std::int64_t passes = data.modelSettings.smoothingIterations;
    if (passes < manyPasses)
        return;
    HStatus status;
    const HDataHandle geometry = inputGeometryHandle(block, data.multiIndex, status);
    const double count = status.error() ? 0.0 : HItGeometry(geometry).count();
    constexpr double perPass = 3e-6, perVertex = 7e-9; // seconds of one core, its loop without vector instructions
    HLongWork::announce("'" + nodeName.asStdString() + "' smooths geometry " + std::to_string(data.multiIndex) +
                            " in " + std::to_string(passes) + " passes, as its model says, in each frame",
                        static_cast<double>(passes) * (perPass + count * perVertex));
}

} // namespace

HStatus neuralWarpNode::resolveModelDirectory(HDataBlock& block, neuralWarpData& data) {
    if (!data.modelPathDirty)
        return HStatus::kSuccess;
    data.modelPathDirty = false;
    data.metadataDirty = true;
    data.modelLoadPending = true;
    data.modelDirectory.clear();
    data.modelRootPath.clear();
    data.directoryState.reset();
    return findModelDirectory(block, data);
}

HStatus neuralWarpNode::loadMetadata(neuralWarpData& data, bool force) {
    if (!data.metadataDirty && !force)
        return HStatus::kSuccess;
    data.metadataDirty = false;
    data.directoryState.reset();
    if (data.modelDirectory.empty())
        return HStatus::kFailure;
    const fs::path file = data.modelDirectory / "metadata.json";
    const Entry entry(file);
    if (entry.status.error())
        return reported(entry.status, sourceUnit::node);
    if (!entry.exists())
        return HStatus::kFailure;
    const DirectoryState state = DirectoryState::atRest(data.modelDirectory);
    if (!readMetadataFile(data.metadata, file)) {
        raiseMessage<Text::kErrorMLMetaLoadFailed>(displayErrorGated, name(), file);
        return HStatus::kFailure;
    }
    data.directoryState = state;
    data.modelSettings.smoothingIterations = data.metadata.smoothingIterations;
    data.modelSettings.deltaMode = data.metadata.deltaMode;
    return HStatus::kSuccess;
}

HStatus neuralWarpNode::loadModel(neuralWarpData& data, bool force) {
    if (!data.modelLoadPending && !force)
        return HStatus::kSuccess;
    data.modelValid = false;
    data.modelLoadPending = false;
    clearPrincipalShapes(data);
    if (data.modelDirectory.empty())
        return HStatus::kFailure;
    if (data.isReplaced())
        return dueAgain(data);
    if (const HStatus status = validateModel(data); status.error())
        return reported(status, sourceUnit::node);
    HStatus network = loadNetwork(data);
    if (data.modelLoadPending)
        return network;
    const HStatus shapes = loadPrincipalShapes(data);
    if (data.isReplaced())
        return dueAgain(data);
    if (shapes.error()) {
        data.modelValid = false; // without knowing its shapes, the network's outputs would be taken for deltas
        return reported(shapes, sourceUnit::node);
    }
    return network;
}

bool neuralWarpNode::updateModelSettings(HDataBlock& block, neuralWarpData& data) {
    if (data.modelPathDirty && resolveModelDirectory(block, data).error())
        return false;
    if (data.metadataDirty) {
        const bool isRead = !loadMetadata(data, false).error();
        // the map is that of the model before: the new one is loaded in the next evaluation
        if (!isRead || data.drivesNothing())
            return false;
    }
    if (data.modelSettings.smoothingIterations != data.activeSettings.smoothingIterations)
        announceSmoothing(block, data, name());
    data.applySettings(data.modelSettings);
    data.releaseUnusedCaches();
    return true;
}

HStatus neuralWarpNode::loadWholeModel(HDataBlock& block, neuralWarpData& data) {
    constexpr int attempts = 8; // who writes for longer than they take is not done yet
    for (int i = 0; i < attempts; ++i) {
        loadModel(data, false); // a failure shows in canApplyModel()
        if (!data.modelLoadPending)
            return HStatus::kSuccess;
        if (i + 1 == attempts)
            break;
        if (!updateModelSettings(block, data))
            return HStatus::kSuccess;
        if (HStatus status = prepareRestState(data, block, data.multiIndex); status.error())
            return status;
    }
    raiseMessage<Text::kErrorMLModelInit>(displayErrorGated, data.multiIndex);
    reported({HStatus::kFailure, "'" + data.modelDirectory.string() +
                                     "' was written again and again while it was read: the next evaluation reads it"},
             sourceUnit::node);
    return HStatus::kSuccess;
}

HStatus neuralWarpNode::validateModel(neuralWarpData& data) {
    data.modelValid = false;
    HStatus result;
    const std::size_t fullCount = data.componentMap.fullCount();
    const std::size_t affectCount = data.componentMap.affectCount();
    if (data.metadata.fullCount != fullCount) {
        raiseMessage<Text::kErrorMLMetaFullCountMismatch>(displayErrorGated, name(), data.multiIndex, fullCount,
                                                          data.metadata.fullCount);
        result = {HStatus::kFailure, "the model was trained on another number of vertices"};
    }
    if (data.metadata.affectCount != affectCount)
        raiseMessage<Text::kWarnMLMetaAffectCountMismatch>(HGlobal::displayWarning, name(), data.multiIndex,
                                                           affectCount, data.metadata.affectCount);
    data.modelValid = !result.error();
    if (result.error()) {
        raiseMessage<Text::kErrorMLModelInvalid>(displayErrorGated, data.multiIndex);
        return result;
    }
    data.buildAffectMap();
    if (data.useAffectMap)
        raiseMessage<Text::kWarnMLMetaSetup>(HGlobal::displayWarning, name(), data.multiIndex,
                                             data.affectedVertices.size(), affectCount,
                                             HString(data.metadata.componentTagExpression));
    return result;
}

HStatus neuralWarpNode::describeModel(std::uint32_t multiIndex, HString& text) {
    return guarded(*this, "describing a model", [&]() -> HStatus {
        text.clear();
        HDataBlock block = forceCache();
        neuralWarpData* data = fetchNodeData(block, multiIndex);
        if (!data)
            return HStatus::kFailure;
        if (const HStatus status = resolveModelDirectory(block, *data); status.error())
            return reported(status, sourceUnit::node);
        text = "{'rootPath' : '" + data->modelRootPath.string() + "' ,'modelPath' : '" + data->modelDirectory.string() +
               "'}";
        return HStatus::kSuccess;
    });
}

} // namespace neuralWarp
