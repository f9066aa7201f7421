// SPDX-License-Identifier: Apache-2.0
// Positions of whole meshes to the device and back, between doubles there and floats here.
#pragma once

#include "geometry/Positions.h"
#include "openquarn/gpu/HOpenCLBuffer.h"

#include <memory>
#include <string_view>

namespace OpenQuarn {

/// Makes room in the buffer for the positions as packed floats. What is large is uploaded, ready with its event; what
/// is small waits, without an event, for writeStaged(), so that the device is not woken for it alone (decision 0188).
/// Answers with CL_SUCCESS, or with the status of what failed, which is noted; the buffer has no contents then.
cl_int stagePositions(const Positions& positions, HOpenCLBuffer& buffer);
/// Uploads what waits, ready with the buffer's event; where nothing does, nothing happens. After a failure, which is
/// noted, it still waits. Whoever hands a buffer to the device calls this first.
cl_int writeStaged(const HOpenCLBuffer& buffer);

/// Waits for the buffer's ready event, and reads as many positions as `positions` has.
cl_int downloadPositions(const HOpenCLBuffer& buffer, Positions& positions);

/// HOpenCLUtils::uploadToGPU() that counts under a name.
cl_int uploadNamed(std::string_view name, std::size_t bytes, const void* data, HOpenCLBuffer& buffer, int mode);

} // namespace OpenQuarn
