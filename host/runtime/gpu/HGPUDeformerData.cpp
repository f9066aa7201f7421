// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HGPUDeformerData.h"

#include "core/threads.h"

#include <algorithm>

struct HGPUDeformerData::Entry {
    HPlug plug;
    HString name;
    HOpenCLBuffer buffer;

    bool isFor(const HPlug& otherPlug, const HString& otherName) const {
        return name == otherName && plug == otherPlug;
    }
};

HGPUDeformerData::HGPUDeformerData() = default;
HGPUDeformerData::~HGPUDeformerData() = default;

HOpenCLBuffer HGPUDeformerData::getBuffer(const HPlug& plug, const HString& name) const {
    OpenQuarn::requireEval("HGPUDeformerData::getBuffer");
    const auto found =
        std::find_if(entries_.begin(), entries_.end(), [&](const Entry& entry) { return entry.isFor(plug, name); });
    return found == entries_.end() ? HOpenCLBuffer() : found->buffer;
}

void HGPUDeformerData::setBuffer(const HPlug& plug, const HString& name, const HOpenCLBuffer& buffer) {
    OpenQuarn::requireEval("HGPUDeformerData::setBuffer");
    const auto found =
        std::find_if(entries_.begin(), entries_.end(), [&](const Entry& entry) { return entry.isFor(plug, name); });
    if (found == entries_.end())
        entries_.push_back({plug, name, buffer});
    else
        found->buffer = buffer;
}

void HGPUDeformerData::clear() noexcept {
    OpenQuarn::requireEval("HGPUDeformerData::clear");
    entries_.clear();
}
