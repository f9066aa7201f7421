// SPDX-License-Identifier: Apache-2.0
#include "deformer/neuralWarpUtils.h"

#include "deformer/neuralWarpNode.h"
#include "frame/FrameObserver.h"
#include "messages/displayErrorGated.h"
#include "messages/messageText.h"
#include "messages/sourceUnits.h"
#include "openquarn/HProfiler.h"

#include <utility>

namespace neuralWarp {

neuralWarpData* fetchNodeData(HDataBlock& block, std::uint32_t multiIndex) {
    HStatus status;
    HArrayDataHandle states = block.outputArrayValue(neuralWarpNode::deformerData, &status);
    if (!status.error())
        status = states.jumpToElement(multiIndex);
    if (status.error())
        return nullptr;
    // the attribute holds data of this one type
    return static_cast<neuralWarpData*>(states.outputValue().asPluginData());
}

HDataHandle existingElement(HDataBlock& block, const HObject& array, std::uint32_t multiIndex, HStatus& status) {
    HArrayDataHandle elements = block.outputArrayValue(array, &status);
    if (!status.error())
        status = elements.jumpToElement(multiIndex);
    return status.error() ? HDataHandle() : elements.inputValue(&status);
}

HStatus gatherControlValues(HDataBlock& block, std::int32_t inputCount, FrameObserver& observer,
                            std::vector<float>& controls) {
    const ObservedStep step(observer, FrameStep::gather);
    HStatus status;
    HArrayDataHandle values = block.inputArrayValue(neuralWarpNode::controlValues, &status);
    if (status.error())
        return reported(status, sourceUnit::utils);
    if (std::cmp_less(values.elementCount(), inputCount)) {
        raiseMessage<Text::kMlNodeControlCountMismatch>(displayErrorGated, inputCount, values.elementCount());
        return {HStatus::kFailure, "the model has more inputs than there are control values"};
    }
    controls.resize(static_cast<std::size_t>(inputCount));
    for (std::size_t i = 0; i < controls.size(); ++i) {
        const HDataHandle value = values.inputValue(&status);
        if (status.error())
            return reported(status, sourceUnit::utils);
        controls[i] = static_cast<float>(value.asDouble());
        if (i + 1 < controls.size())
            status = values.next();
        if (status.error())
            return reported(status, sourceUnit::utils);
    }
    return HStatus::kSuccess;
}

int evaluationCategory() {
    static const int category = HProfiler::getCategoryIndex("Evaluation");
    return category;
}

HStatus reported(const HStatus& status, const char* sourceUnit, int line) {
    status.pAPIerror(sourceUnit, line);
    return status;
}

} // namespace neuralWarp
