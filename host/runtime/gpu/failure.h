// SPDX-License-Identifier: Apache-2.0
// Why the last thing on the device failed, for the host's message.
#pragma once

#include "openquarn/gpu/opencl.h"

#include <string>
#include <string_view>

namespace OpenQuarn {

/// Keeps the first failure on this thread since takeFailure(): "clCreateBuffer: CL_OUT_OF_RESOURCES (-5), 1200 bytes".
/// Returns the status; does nothing for CL_SUCCESS. Thread: any.
cl_int noteFailure(cl_int status, std::string_view call, std::string_view detail = {}) noexcept;
/// A failure that has no OpenCL status.
void noteFailure(std::string_view text) noexcept;
/// The text, which is forgotten; empty when nothing failed.
std::string takeFailure();

} // namespace OpenQuarn
