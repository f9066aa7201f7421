// SPDX-License-Identifier: Apache-2.0
// Arguments and uploads.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/gpu/HOpenCLBuffer.h"
#include "openquarn/gpu/HOpenCLKernelInfo.h"

#include <cstddef>

/// `[any]` throughout.
class OPENQUARN_API HOpenCLUtils {
public:
    HOpenCLUtils() = delete;

    /// Sets an argument that is a value: `bytes` of it at `value`, null for a null buffer. Does nothing unless `status`
    /// is CL_SUCCESS; a failure is put into it.
    static void setKernelArg(const HOpenCLKernelInfo& kernel, cl_uint index, std::size_t bytes, const void* value,
                             cl_int& status);

    enum UploadMode : int {
        kKeepData = 0, ///< The data stays where it is, unchanged, until the buffer's ready event.
        kCopyData = 1, ///< The data may go when the call returns.
    };

    /// Makes the buffer hold `bytes` of `data`, and sets its ready event. With 0 bytes, `data` may be null: the buffer
    /// then has the size 0, and nothing crosses. Up to 1 MiB does not wait for the work in flight. A failure lets go of
    /// the buffer.
    static cl_int uploadToGPU(std::size_t bytes, const void* data, HOpenCLBuffer& buffer, int mode = kCopyData);
};
