// SPDX-License-Identifier: Apache-2.0
// Positions of whole meshes to the device and back, between doubles there and floats here.
#pragma once

#include "geometry/Positions.h"
#include "openquarn/gpu/HOpenCLBuffer.h"

#include <memory>
#include <string_view>

namespace OpenQuarn {

/// Makes the buffer hold the positions as packed floats, ready with its event. Answers with CL_SUCCESS, or with the
/// status of what failed, which is noted; the buffer has no contents then.
cl_int uploadPositions(const Positions& positions, HOpenCLBuffer& buffer);

/// Waits for the buffer's ready event, and reads as many positions as `positions` has.
cl_int downloadPositions(const HOpenCLBuffer& buffer, Positions& positions);

/// HOpenCLUtils::uploadToGPU() that counts under a name.
cl_int uploadNamed(std::string_view name, std::size_t bytes, const void* data, HOpenCLBuffer& buffer, int mode);

} // namespace OpenQuarn
