// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HGPUDeformerData.h"

#include "core/Operations.h"
#include "gpu/transfer.h"

#include <utility>

using OpenQuarn::isRefused;
using OpenQuarn::Operation;

HGPUDeformerData::HGPUDeformerData() = default;
HGPUDeformerData::~HGPUDeformerData() = default;

HOpenCLBuffer HGPUDeformerData::getBuffer(const HPlug& plug, const HString& name, cl_int* status) const {
    cl_int outcome = CL_INVALID_OPERATION;
    HOpenCLBuffer buffer;
    if (!isRefused(Operation::HGPUDeformerData_getBuffer)) {
        buffer = find(plug, name, outcome);
        if (outcome == CL_SUCCESS)
            outcome = OpenQuarn::writeStaged(buffer);
        if (outcome != CL_SUCCESS)
            buffer.reset();
    }
    if (status)
        *status = outcome;
    return buffer;
}

HOpenCLBuffer HGPUDeformerData::find(const HPlug& plug, const HString& name, cl_int& status) const {
    status = CL_SUCCESS;
    for (const Entry& entry : entries_)
        if (entry.plug == plug && entry.name == name)
            return entry.supplier ? entry.supplier(status) : entry.buffer;
    return {};
}

HGPUDeformerData::Entry& HGPUDeformerData::entryOf(const HPlug& plug, const HString& name) {
    for (Entry& entry : entries_)
        if (entry.plug == plug && entry.name == name)
            return entry;
    entries_.push_back({plug, name, {}, {}});
    return entries_.back();
}

void HGPUDeformerData::setBuffer(const HPlug& plug, const HString& name, const HOpenCLBuffer& buffer) {
    if (isRefused(Operation::HGPUDeformerData_setBuffer))
        return;
    Entry& entry = entryOf(plug, name);
    entry.buffer = buffer;
    entry.supplier = nullptr;
}

void HGPUDeformerData::setSupplier(const HPlug& plug, const HString& name, Supplier supplier) {
    if (isRefused(Operation::HGPUDeformerData_setSupplier))
        return;
    entryOf(plug, name).supplier = std::move(supplier);
}

void HGPUDeformerData::clear() noexcept {
    if (isRefused(Operation::HGPUDeformerData_clear))
        return;
    entries_.clear();
}
