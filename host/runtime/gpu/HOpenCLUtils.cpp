// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HOpenCLUtils.h"

#include "gpu/transfer.h"

cl_int HOpenCLUtils::uploadToGPU(std::size_t bytes, const void* data, HOpenCLBuffer& buffer, int mode) {
    return OpenQuarn::uploadNamed("values", bytes, data, buffer, mode);
}
