// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Gpu.h"

#include "gpu/Device.h"
#include "gpu/deviceList.h"
#include "gpu/failure.h"
#include "gpu/programs.h"

#include <algorithm>
#include <iterator>
#include <stdexcept>

namespace OpenQuarn {

std::vector<GpuDevice> Gpu::devices() {
    const std::vector<cl_device_id> ids = findDevices();
    if (ids.empty())
        takeFailure(); // the answer says it
    std::vector<GpuDevice> devices;
    devices.reserve(ids.size());
    std::transform(ids.begin(), ids.end(), std::back_inserter(devices), describeDevice);
    return devices;
}

void Gpu::chooseDevice(const std::string& choice) {
    if (!choice.empty()) {
        const std::vector<GpuDevice> all = devices();
        if (!matchDevice(all, choice))
            throw std::invalid_argument("there is no OpenCL device \"" + choice + "\": " + listDevices(all));
    }
    setDeviceChoice(choice);
}

std::optional<GpuDevice> Gpu::currentDevice() {
    const auto device = openDevice();
    return device ? std::optional(describeDevice(device->id)) : std::nullopt;
}

void Gpu::assumeNoDoubles(bool assume) {
    compileWithoutDoubles(assume);
}

void Gpu::setTiming(bool on) {
    setDeviceTiming(on);
}

} // namespace OpenQuarn
