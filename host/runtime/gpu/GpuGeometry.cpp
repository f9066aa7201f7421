// SPDX-License-Identifier: Apache-2.0
#include "gpu/GpuGeometry.h"

#include "gpu/failure.h"
#include "gpu/transfer.h"
#include "graph/Node.h"

namespace OpenQuarn {

cl_int DevicePositions::bring(const Positions& positions) {
    if (version == positions.version())
        return CL_SUCCESS;
    const cl_int status = stagePositions(positions, buffer);
    version = status == CL_SUCCESS ? positions.version() : 0;
    return status;
}

bool GpuGeometry::enterDevice(const std::shared_ptr<Device>& onto) {
    if (deformer && device_ == onto)
        return true;
    leaveDevice();
    deformer.reset(info.createGPUDeformer());
    if (!deformer) {
        noteFailure("its plug-in made no GPU deformer");
        return false;
    }
    device_ = onto;
    return true;
}

void GpuGeometry::leaveDevice() noexcept {
    if (deformer)
        callPlugin(node_, "terminate", [&]() -> HStatus {
            deformer->terminate();
            return HStatus::kSuccess;
        });
    deformer.reset();
    inputData.clear();
    outputData.clear();
    input = {};
    passedThrough = {};
    additional.clear();
    device_.reset();
}

} // namespace OpenQuarn
