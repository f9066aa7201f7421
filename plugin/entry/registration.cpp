// SPDX-License-Identifier: Apache-2.0
#include "entry/registration.h"

#include "controls/controlCollectorNode.h"
#include "controls/matrixConverterNode.h"
#include "controls/orthoAxisFromMatrixArray.h"
#include "deformer/neuralWarpCmd.h"
#include "deformer/neuralWarpNode.h"
#include "deformer/neuralWarpNodeGPUDeformerInfo.h"
#include "messages/catalogue.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/gpu/HGPUDeformerRegistry.h"

#include <initializer_list>

namespace neuralWarp {
namespace {

struct Step {
    const char* text; ///< printed when it fails
    HStatus (*run)(HFnPlugin&);
    bool mayFail = false; ///< the next steps are made all the same
};

/// The status of the last step made.
HStatus runSteps(HFnPlugin& plugin, std::initializer_list<Step> steps) {
    HStatus status;
    for (const Step& step : steps) {
        status = step.run(plugin);
        status.perror(step.text);
        if (status.error() && !step.mayFail)
            return status;
        status = HStatus::kSuccess;
    }
    return status;
}

template <class Node>
HStatus registerNode(HFnPlugin& plugin, HPxNode::Type type) {
    return plugin.registerNode(Node::typeName, Node::id, Node::create, Node::initialize, type);
}

template <class Node>
HStatus registerControl(HFnPlugin& plugin) {
    return registerNode<Node>(plugin, HPxNode::kDependNode);
}

template <class Node>
HStatus deregisterNode(HFnPlugin& plugin) {
    return plugin.deregisterNode(Node::id);
}

HStatus registerStateData(HFnPlugin& plugin) {
    return plugin.registerData(neuralWarpData::typeName, neuralWarpData::id, neuralWarpData::create, HPxData::kData);
}

HStatus deregisterStateData(HFnPlugin& plugin) {
    return plugin.deregisterData(neuralWarpData::id);
}

HStatus registerDeformer(HFnPlugin& plugin) {
    return registerNode<neuralWarpNode>(plugin, HPxNode::kDeformerNode);
}

HStatus registerGPUDeformer(HFnPlugin&) {
    return HGPUDeformerRegistry::registerGPUDeformerCreator(neuralWarpNode::typeName,
                                                            neuralWarpNodeGPUDeformerInfo::registrantId,
                                                            &neuralWarpNodeGPUDeformerInfo::instance());
}

HStatus deregisterGPUDeformer(HFnPlugin&) {
    return HGPUDeformerRegistry::deregisterGPUDeformerCreator(neuralWarpNode::typeName,
                                                              neuralWarpNodeGPUDeformerInfo::registrantId);
}

HStatus registerDeformerCommand(HFnPlugin& plugin) {
    return plugin.registerCommand(neuralWarpCmd::commandName, neuralWarpCmd::create, neuralWarpCmd::makeSyntax);
}

HStatus deregisterDeformerCommand(HFnPlugin& plugin) {
    return plugin.deregisterCommand(neuralWarpCmd::commandName);
}

HStatus registerTexts(HFnPlugin& plugin) {
    return plugin.registerUIStrings(registerCatalogue, "");
}

} // namespace

HStatus registerPlugin(HObject object) {
    HFnPlugin plugin(object, "Kestrava", "3.0", "Any");
    return runSteps(plugin, {
                                {"registerData neuralWarpData", registerStateData},
                                {"registerNode neuralWarp", registerDeformer},
                                {"registerGPUDeformerCreator neuralWarp", registerGPUDeformer},
                                {"registerCommand neuralWarp", registerDeformerCommand},
                                {"registerUIStrings neuralWarp", registerTexts, true},
                                {"registerNode controlCollectorNode", registerControl<controlCollectorNode>},
                                {"registerNode orthoAxisFromMatrixArray", registerControl<orthoAxisFromMatrixArray>},
                                {"registerNode matrixConverterNode", registerControl<matrixConverterNode>},
                            });
}

HStatus deregisterPlugin(HObject object) {
    HFnPlugin plugin(object, "Unknown", "Unknown", "Any");
    return runSteps(plugin, {
                                {"deregisterNode matrixConverterNode", deregisterNode<matrixConverterNode>},
                                {"deregisterNode orthoAxisFromMatrixArray", deregisterNode<orthoAxisFromMatrixArray>},
                                {"deregisterNode controlCollectorNode", deregisterNode<controlCollectorNode>},
                                {"deregisterGPUDeformerCreator neuralWarp", deregisterGPUDeformer},
                                {"deregisterNode neuralWarp", deregisterNode<neuralWarpNode>},
                                {"deregisterData neuralWarpData", deregisterStateData},
                                {"deregisterCommand neuralWarp", deregisterDeformerCommand},
                            });
}

} // namespace neuralWarp
