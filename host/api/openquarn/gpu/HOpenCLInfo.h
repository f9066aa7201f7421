// SPDX-License-Identifier: Apache-2.0
// The device that the host computes on.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/gpu/opencl.h"

/// `[any]` throughout.
class OPENQUARN_API HOpenCLInfo {
public:
    HOpenCLInfo() = delete;

    /// The in-order queue that all of the host's and its plug-ins' work goes to; null when there is no device. Stays
    /// the host's, and changes when the device is lost.
    static cl_command_queue getQuarnDefaultOpenCLCommandQueue() noexcept;

    /// For the status of an OpenCL call that was made without the host's wrappers: keeps a failure, with its name and
    /// the place of the call, as the reason in the host's next message. Returns the status.
    static cl_int checkCLErrorStatus(cl_int status, const char* file = __builtin_FILE(),
                                     int line = __builtin_LINE()) noexcept;

    /// For a failure that no OpenCL call had: keeps the reason for the host's next message, unless there is one
    /// already.
    static void explainFailure(const char* reason) noexcept;

    /// "CL_OUT_OF_RESOURCES"; "unknown status" for one that OpenCL does not name.
    static const char* statusName(cl_int status) noexcept;
};
