// SPDX-License-Identifier: Apache-2.0
// The life of the node: its making, its state of each geometry, and what is asked of it beside evaluation.
#include "deformer/neuralWarpNode.h"

#include "deformer/namedBuffers.h"
#include "deformer/neuralWarpUtils.h"
#include "messages/guard.h"
#include "messages/sourceUnits.h"
#include "openquarn/HCommandResult.h"
#include "openquarn/HFileIO.h"
#include "openquarn/HFileObject.h"
#include "openquarn/HFnData.h"
#include "openquarn/HGlobal.h"

namespace neuralWarp {
namespace {

/// How a model root is looked for: the environment's variables are filled in, a relative path is taken from the folder
/// of the scene (of the workspace, while there is none) first and then as it is, and a folder that is missing keeps its
/// name.
constexpr int modelRootResolveMethod = 54;

/// Empty when the host cannot say.
HString workspaceRoot() {
    HCommandResult result;
    HGlobal::executeCommand("workspace -q -rootDirectory", result, false, false);
    HString root;
    if (result.resultType() == HCommandResult::kString)
        result.getResult(root);
    return root;
}

/// The element of `deformerData` for a geometry, made when it is missing.
HDataHandle stateElement(HDataBlock& block, unsigned multiIndex, HStatus& status) {
    HArrayDataHandle states = block.outputArrayValue(neuralWarpNode::deformerData, &status);
    if (status.error())
        return {};
    status = states.jumpToElement(multiIndex);
    if (status.error()) {
        HArrayDataBuilder builder = states.builder();
        builder.addElement(multiIndex);
        states.set(builder);
        status = states.jumpToElement(multiIndex);
    }
    return status.error() ? HDataHandle() : states.outputValue(&status);
}

/// `settings` stays as it is on failure.
HStatus readExportSettings(HDataBlock& block, unsigned multiIndex, DeltaSettings& settings) {
    HStatus status;
    const HDataHandle element = existingElement(block, neuralWarpNode::exportList, multiIndex, status);
    if (status.error())
        return status;
    const HDataHandle iterations = element.child(neuralWarpNode::smoothingIterations);
    const HDataHandle mode = element.child(neuralWarpNode::deltaMode);
    if (!iterations.isValid() || !mode.isValid())
        return {HStatus::kFailure, "export[" + std::to_string(multiIndex) + "] cannot be read"};
    settings.smoothingIterations = iterations.asInt();
    settings.deltaMode = static_cast<std::uint32_t>(mode.asShort());
    return HStatus::kSuccess;
}

} // namespace

const HTypeId neuralWarpNode::id{0x58000971};
const HString neuralWarpNode::typeName("neuralWarp");

HPxNode* neuralWarpNode::create() {
    return new neuralWarpNode;
}

neuralWarpNode::neuralWarpNode()
    : attributeCallback_(HNodeMessage::addAttributeChangedCallback(thisHObject(), attributeChanged, this)) {}

neuralWarpNode::~neuralWarpNode() {
    HMessage::removeCallback(attributeCallback_);
}

void neuralWarpNode::postConstructor() {
    guardedAndShown(*this, "setting the default folders", [&] {
        if (HFileIO::currentlyReadingFileVersion() >= 0)
            return; // the stored values apply
        const HString root = workspaceRoot();
        HPlug(thisHObject(), modelRoot).setString(root + "neuralWarp/models");
        HPlug(thisHObject(), trainingDataRoot).setString(root + "cache/neuralWarp/trainingData");
    });
}

HStringArray neuralWarpNode::getFilesToArchive(bool, bool unresolvedName, bool) const {
    HStringArray files;
    guardedAndShown(*this, "listing the files to archive", [&] {
        HStatus status;
        HString root = HPlug(thisHObject(), modelRoot).asString(&status);
        if (status.error() || root.isEmpty())
            return;
        if (!unresolvedName) {
            HFileObject file;
            file.setResolveMethod(modelRootResolveMethod);
            file.setRawFullName(root);
            root = file.resolvedFullName();
        }
        if (!root.isEmpty())
            files.append(root);
    });
    return files;
}

void neuralWarpNode::getExternalContent(HExternalContentInfoTable& table) const {
    guardedAndShown(*this, "listing the external content", [&] {
        addExternalContentForFileAttr(table, modelRoot);
        HPxDeformerNode::getExternalContent(table);
    });
}

void neuralWarpNode::setExternalContent(const HExternalContentLocationTable& table) {
    guardedAndShown(*this, "moving the external content", [&] {
        setExternalContentForFileAttr(modelRoot, table);
        HPxDeformerNode::setExternalContent(table);
    });
}

HStatus neuralWarpNode::initializeMultiIndex(HDataBlock& block, unsigned multiIndex, bool reset) {
    return guarded(*this, "setting up a geometry", [&]() -> HStatus {
        HStatus status;
        HDataHandle element = stateElement(block, multiIndex, status);
        if (status.error())
            return reported(status, sourceUnit::node);
        if (!element.asPluginData())
            element.set(HFnPluginData().create(neuralWarpData::id));
        auto* data = static_cast<neuralWarpData*>(element.asPluginData());
        if (!data)
            return {HStatus::kFailure,
                    "'" + name().asStdString() + "': there is no state for geometry " + std::to_string(multiIndex)};
        if (reset) {
            data->markAllDirty();
            data->multiIndex = multiIndex;
        }
        return HStatus::kSuccess;
    });
}

void neuralWarpNode::attributeChanged(int mask, HPlug& plug, HPlug&, void* clientData) {
    if ((mask & HNodeMessage::kAttributeSet) == 0 || !clientData)
        return;
    if (plug != modelRoot && plug != modelName)
        return;
    auto& node = *static_cast<neuralWarpNode*>(clientData);
    guardedAndShown(node, "asking for a reload", [&] { node.raiseReloadFlags(); });
}

void neuralWarpNode::raiseReloadFlags() {
    HDataBlock block = forceCache();
    const HArrayDataHandle states = block.outputArrayValue(deformerData);
    for (std::uint32_t i = 0; i < states.elementCount(); ++i)
        if (neuralWarpData* data = fetchNodeData(block, i))
            data->setModelPathDirty(true);
}

HObject neuralWarpNode::getNamedBuffer(const HString& name, unsigned multiIndex) {
    HObject buffer;
    guardedAndShown(*this, "publishing a buffer", [&] {
        HDataBlock block = forceCache();
        if (const neuralWarpData* data = fetchNodeData(block, multiIndex))
            buffer = namedBuffer(*data, name.asStdString());
    });
    return buffer;
}

bool neuralWarpNode::isDueOnCpu(HDataBlock& block, unsigned multiIndex) {
    const neuralWarpData* data = fetchNodeData(block, multiIndex);
    if (!data || data->exportMode)
        return false;
    return data->hasDueCaches() || data->hasNewLoads();
}

void neuralWarpNode::primingAttributes(HObjectArray& attributes) const {
    for (const HObject& attribute : {modelActive, targetMorphEnabled, targetMorphEnvelope})
        attributes.append(attribute);
}

HStatus neuralWarpNode::setExportActive(std::uint32_t multiIndex, bool active) {
    return guarded(*this, "switching export mode", [&]() -> HStatus {
        HDataBlock block = forceCache();
        neuralWarpData* data = fetchNodeData(block, multiIndex);
        if (!data)
            return HStatus::kInvalidParameter;
        const HStatus status = active ? readExportSettings(block, multiIndex, data->exportSettings) : HStatus();
        if (status.error())
            return reported(status, sourceUnit::node);
        data->setExportMode(active);
        return HStatus::kSuccess;
    });
}

HStatus neuralWarpNode::requestReload(std::uint32_t multiIndex) {
    return guarded(*this, "asking for a reload", [&]() -> HStatus {
        HDataBlock block = forceCache();
        neuralWarpData* data = fetchNodeData(block, multiIndex);
        if (!data)
            return HStatus::kFailure;
        data->setModelPathDirty(true);
        return HStatus::kSuccess;
    });
}

} // namespace neuralWarp
