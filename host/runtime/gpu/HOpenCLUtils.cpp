// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HOpenCLUtils.h"

#include "gpu/failure.h"
#include "gpu/transfer.h"

#include <string>

void HOpenCLUtils::setKernelArg(const HOpenCLKernelInfo& kernel, cl_uint index, std::size_t bytes, const void* value,
                                cl_int& status) {
    if (status != CL_SUCCESS)
        return;
    status = kernel.isLoaded() ? clSetKernelArg(kernel.kernel(), index, bytes, value) : CL_INVALID_KERNEL;
    if (status != CL_SUCCESS)
        OpenQuarn::noteFailure(status, "clSetKernelArg", "argument " + std::to_string(index));
}

cl_int HOpenCLUtils::uploadToGPU(std::size_t bytes, const void* data, HOpenCLBuffer& buffer, int mode) {
    return OpenQuarn::uploadNamed("values", bytes, data, buffer, mode);
}
