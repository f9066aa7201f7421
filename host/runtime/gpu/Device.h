// SPDX-License-Identifier: Apache-2.0
// The OpenCL device in use, with its context and its queue.
#pragma once

#include "openquarn/gpu/opencl.h"

#include <memory>
#include <string>

namespace OpenQuarn {

/// Everything that was made on a device keeps it: the context is released after the last of it.
struct Device {
    Device() = default;
    ~Device();
    Device(const Device&) = delete;
    Device& operator=(const Device&) = delete;

    cl_device_id id = nullptr;
    cl_context context = nullptr;
    cl_command_queue queue = nullptr; ///< in order
    bool hasDoubles = false;
    bool isTimed = false;         ///< the queue records when commands ran
    bool roundsCorrectly = false; ///< can divide and take roots of floats as the CPU does
    std::string name;
};

/// The device that was chosen, opened when it is not open yet. Null, with the reason noted (failure.h), when there is
/// none. Thread: any.
std::shared_ptr<Device> currentDevice();
/// The open device; null when none is.
std::shared_ptr<Device> openDevice();
/// The next currentDevice() opens one anew. Compiled programs and times that are not measured yet go too. Thread: any.
void closeDevice();

/// The choice of Gpu::chooseDevice(), which is known to mean a device; closes the one that is open.
void setDeviceChoice(const std::string& choice);
/// Whether queues record times from now on; closes the open device when that changes.
void setDeviceTiming(bool isTimed);

} // namespace OpenQuarn
