// SPDX-License-Identifier: Apache-2.0
// The devices that the OpenCL loader knows.
#pragma once

#include "openquarn/gpu/opencl.h"
#include "openquarn_app/Gpu.h"

#include <optional>
#include <string>
#include <vector>

namespace OpenQuarn {

/// Of all platforms: GPUs first, then the others. When it is empty, the reason is noted. Thread: any.
std::vector<cl_device_id> findDevices();
/// What cannot be asked stays empty.
GpuDevice describeDevice(cl_device_id id);
std::string deviceName(cl_device_id id);
/// The device that a choice means (Gpu::chooseDevice); none when there is no such device.
std::optional<std::size_t> matchDevice(const std::vector<GpuDevice>& devices, const std::string& choice);
/// "0: NAME (PLATFORM), 1: ...", or that there is none.
std::string listDevices(const std::vector<GpuDevice>& devices);

} // namespace OpenQuarn
