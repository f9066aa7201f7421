// SPDX-License-Identifier: Apache-2.0
#include "deformer/neuralWarpCmd.h"

#include "deformer/neuralWarpNode.h"
#include "messages/messageText.h"
#include "openquarn/HArgDatabase.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HPlug.h"
#include "openquarn/HSelectionList.h"

#include <algorithm>
#include <new>
#include <string>
#include <vector>

namespace neuralWarp {
namespace {

constexpr const char* multiIndexFlag = "-multiIndex";
constexpr const char* reloadModelFlag = "-reloadModel";
constexpr const char* vertexDeltasFlag = "-vertexDeltas";
constexpr const char* exportActiveFlag = "-exportActive";
constexpr const char* dumpInfoFlag = "-dumpInfo";

using Indices = std::vector<unsigned>;

void showError(const HString& text) {
    HPxCommand::displayError(text);
}

HStatus invalidNode(const HString& name, const HStatus& status) {
    raiseMessage<Text::kErrorInvalidMLNode>(showError, name);
    return status;
}

/// The deformer that the command's argument names; null, with a failing status and a message, when it names none.
neuralWarpNode* findNode(const HArgDatabase& arguments, HObject& object, HStatus& status) {
    const HString name = arguments.commandArgumentString(0, &status);
    if (status.error())
        return nullptr;
    HSelectionList selection;
    selection.add(name); // what cannot be added is looked up, and said, below
    status = arguments.getCommandArgument(0, selection);
    if (!status.error())
        status = selection.getDependNode(0, object);
    if (!status.error() && HFnDependencyNode(object).typeId() != neuralWarpNode::id)
        status = HStatus::kFailure;
    auto* node = status.error() ? nullptr : dynamic_cast<neuralWarpNode*>(HFnDependencyNode(object).userNode());
    if (!node)
        status = invalidNode(name, status.error() ? status : HStatus(HStatus::kFailure));
    return node;
}

Indices existingIndices(const HObject& node) {
    Indices indices;
    HStatus status;
    const HPlug outputs = HFnDependencyNode(node).findPlug("outputGeom", &status);
    if (!status.error())
        outputs.getExistingArrayAttributeIndices(indices);
    return indices;
}

/// The indices to work on. Fails, with a message, at the first one that the node does not have.
HStatus chooseIndices(const HArgDatabase& arguments, const Indices& existing, Indices& chosen) {
    if (!arguments.isFlagSet(multiIndexFlag)) {
        chosen = existing;
        return HStatus::kSuccess;
    }
    const unsigned uses = arguments.numberOfFlagUses(multiIndexFlag);
    chosen.reserve(uses);
    for (unsigned use = 0; use < uses; ++use) {
        HArgList words;
        HStatus status = arguments.getFlagArgumentList(multiIndexFlag, use, words);
        // the syntax lets unsigned integers through; read as an int, the upper half of them would not be one
        const double number = status.error() ? 0.0 : words.asDouble(0, &status);
        if (status.error())
            continue;
        const auto index = static_cast<unsigned>(number);
        if (std::find(existing.begin(), existing.end(), index) == existing.end()) {
            raiseMessage<Text::kErrorMLDataInvalidIndex>(showError, index);
            return HStatus::kFailure;
        }
        chosen.push_back(index);
    }
    return HStatus::kSuccess;
}

HStatus dumpInfo(neuralWarpNode& node, const Indices& indices) {
    std::string entries;
    for (const unsigned index : indices) {
        HString text;
        if (node.describeModel(index, text).error())
            continue;
        if (!entries.empty())
            entries += ", ";
        entries += std::to_string(index) + " : " + text.asStdString();
    }
    return HPxCommand::setResult(HString("{" + entries + "}"));
}

/// The status of the last index.
HStatus switchExport(const HArgDatabase& arguments, neuralWarpNode& node, const Indices& indices) {
    bool isActive = false;
    HStatus status = arguments.getFlagArgument(exportActiveFlag, 0, isActive);
    if (status.error())
        return status;
    for (const unsigned index : indices)
        status = node.setExportActive(index, isActive);
    return status;
}

HStatus reloadModels(neuralWarpNode& node, const Indices& indices) {
    HStatus status;
    for (const unsigned index : indices) {
        status = node.requestReload(index);
        if (status.error())
            raiseMessage<Text::kErrorMLDataInvalidIndex>(showError, index);
    }
    return status;
}

/// The first array is the result; those after it are appended.
HStatus giveDeltas(const HDoubleArray& deltas, bool isFirst) {
    if (isFirst)
        return HPxCommand::setResult(deltas);
    HStatus status;
    for (const double value : deltas)
        if (status = HPxCommand::appendToResult(value); status.error())
            return status;
    return status;
}

HStatus extractDeltas(const HArgDatabase& arguments, neuralWarpNode& node, const Indices& indices) {
    HString code;
    HStatus status = arguments.getFlagArgument(vertexDeltasFlag, 0, code);
    if (status.error())
        return status;
    const TargetDeltaType type = targetDeltaTypeOf(code.asStdString());
    if (type == TargetDeltaType::invalid) {
        raiseMessage<Text::kErrorMLDataInvalidDeltaType>(showError, code);
        return HStatus::kFailure;
    }
    bool isFirst = true;
    for (const unsigned index : indices) {
        HDoubleArray deltas;
        status = node.getVertexDeltas(deltas, index, type);
        if (status == HStatus::kInvalidParameter) {
            raiseMessage<Text::kErrorMLDataInvalidIndex>(showError, index);
        } else if (status.error()) {
            raiseMessage<Text::kErrorMLNodeDeltaCalcFailed>(showError, index);
        } else {
            status = giveDeltas(deltas, isFirst);
            isFirst = false;
        }
    }
    return status;
}

HStatus run(const HArgDatabase& arguments) {
    HStatus status;
    HObject object;
    neuralWarpNode* node = findNode(arguments, object, status);
    if (!node)
        return status;
    Indices indices;
    status = chooseIndices(arguments, existingIndices(object), indices);
    if (status.error())
        return status;
    if (arguments.isFlagSet(dumpInfoFlag))
        status = dumpInfo(*node, indices);
    if (arguments.isFlagSet(exportActiveFlag))
        status = switchExport(arguments, *node, indices);
    if (arguments.isFlagSet(reloadModelFlag))
        status = reloadModels(*node, indices);
    else if (arguments.isFlagSet(vertexDeltasFlag))
        status = extractDeltas(arguments, *node, indices);
    return status;
}

} // namespace

const HString neuralWarpCmd::commandName("neuralWarp");

HPxCommand* neuralWarpCmd::create() {
    return new (std::nothrow) neuralWarpCmd;
}

HSyntax neuralWarpCmd::makeSyntax() {
    HSyntax syntax;
    syntax.addFlag("-mi", multiIndexFlag, HSyntax::kUnsigned);
    syntax.makeFlagMultiUse(multiIndexFlag);
    syntax.addFlag("-rm", reloadModelFlag);
    syntax.addFlag("-vd", vertexDeltasFlag, HSyntax::kString);
    syntax.addFlag("-exp", exportActiveFlag, HSyntax::kBoolean);
    syntax.addFlag("-dui", dumpInfoFlag);
    syntax.addArg(HSyntax::kString);
    syntax.enableEdit(false);
    syntax.enableQuery(false);
    return syntax;
}

HStatus neuralWarpCmd::doIt(const HArgList& args) {
    try {
        clearResult();
        HStatus status;
        const HArgDatabase arguments(syntax(), args, &status);
        return status.error() ? status : run(arguments);
    } catch (const std::bad_alloc&) {
        return HStatus::kInsufficientMemory;
    } catch (const std::exception& error) {
        return {HStatus::kFailure, error.what()};
    }
}

} // namespace neuralWarp
