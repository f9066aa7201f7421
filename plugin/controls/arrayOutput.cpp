// SPDX-License-Identifier: Apache-2.0
#include "controls/arrayOutput.h"

namespace neuralWarp {
namespace {

HStatus setElements(HArrayDataBuilder& builder, std::span<const double> values) {
    unsigned index = 0;
    for (const double value : values) {
        HStatus status;
        HDataHandle element = builder.addElement(index++, &status);
        if (status.error())
            return status;
        if (status = element.set(value); status.error())
            return status;
    }
    return HStatus::kSuccess;
}

// by position: somebody who asked for an element beyond the last has made one, so the indices may have gaps
// (decision 0056)
HStatus removeFrom(HArrayDataHandle& array, HArrayDataBuilder& builder, std::size_t firstSurplus) {
    for (unsigned position = array.elementCount(); position > 0; --position) {
        HStatus status = array.jumpToPosition(position - 1);
        if (status.error())
            return status;
        const unsigned index = array.elementIndex(&status);
        if (status.error() || index < firstSurplus)
            return status;
        if (status = builder.removeElement(index); status.error())
            return status;
    }
    return HStatus::kSuccess;
}

/// The element as a place to write, added when it is missing.
HDataHandle elementAt(HArrayDataHandle& array, HArrayDataBuilder& builder, unsigned index, HStatus& status) {
    return array.jumpToElement(index).error() ? builder.addElement(index, &status) : array.outputValue(&status);
}

} // namespace

HStatus writeElements(HArrayDataHandle& array, std::span<const double> values, Surplus surplus) {
    HStatus status;
    HArrayDataBuilder builder = array.builder(&status);
    if (status.error())
        return status;
    if (status = setElements(builder, values); status.error())
        return status;
    if (surplus == Surplus::remove)
        if (status = removeFrom(array, builder, values.size()); status.error())
            return status;
    if (status = array.set(builder); status.error())
        return status;
    return array.setAllClean();
}

HStatus writeListElement(HArrayDataHandle& list, HArrayDataBuilder& builder, unsigned index, const HObject& child,
                         std::span<const double> values, Surplus surplus) {
    HStatus status;
    const HDataHandle element = elementAt(list, builder, index, status);
    if (status.error())
        return status;
    HArrayDataHandle array = element.childArray(child, &status);
    return status.error() ? status : writeElements(array, values, surplus);
}

} // namespace neuralWarp
