// SPDX-License-Identifier: Apache-2.0
#include "gpu/Device.h"

#include "gpu/activity.h"
#include "gpu/deviceList.h"
#include "gpu/failure.h"
#include "gpu/programs.h"

#include <algorithm>
#include <iterator>
#include <mutex>
#include <vector>

namespace OpenQuarn {
namespace {

struct State {
    std::mutex mutex;
    std::string choice;
    bool isTimed = false;
    std::shared_ptr<Device> open;
};

// never destroyed: what is still open at the end of the process is not released behind the driver's own end
State& state() {
    static State& theState = *new State;
    return theState;
}

// null, with the reason noted, when there is none
cl_device_id chosenDevice(const std::string& choice) {
    const std::vector<cl_device_id> ids = findDevices();
    if (ids.empty() || choice.empty())
        return ids.empty() ? nullptr : ids.front();
    std::vector<GpuDevice> devices;
    devices.reserve(ids.size());
    std::transform(ids.begin(), ids.end(), std::back_inserter(devices), describeDevice);
    const auto number = matchDevice(devices, choice);
    if (!number)
        noteFailure("there is no OpenCL device \"" + choice + "\": " + listDevices(devices));
    return number ? ids[*number] : nullptr;
}

bool askConfig(cl_device_id id, cl_device_info what, cl_device_fp_config& config) {
    return noteFailure(clGetDeviceInfo(id, what, sizeof config, &config, nullptr), "clGetDeviceInfo") == CL_SUCCESS;
}

bool askAbilities(Device& device) {
    cl_device_fp_config singles = 0;
    cl_device_fp_config doubles = 0;
    if (!askConfig(device.id, CL_DEVICE_SINGLE_FP_CONFIG, singles) ||
        !askConfig(device.id, CL_DEVICE_DOUBLE_FP_CONFIG, doubles))
        return false;
    device.hasDoubles = doubles != 0;
    device.roundsCorrectly = (singles & CL_FP_CORRECTLY_ROUNDED_DIVIDE_SQRT) != 0;
    device.name = deviceName(device.id);
    return true;
}

bool makeQueue(Device& device) {
    cl_int status = CL_SUCCESS;
    device.context = clCreateContext(nullptr, 1, &device.id, nullptr, nullptr, &status);
    if (noteFailure(status, "clCreateContext", device.name) != CL_SUCCESS)
        return false;
    const cl_command_queue_properties properties = device.isTimed ? CL_QUEUE_PROFILING_ENABLE : 0;
    device.queue = clCreateCommandQueue(device.context, device.id, properties, &status);
    return noteFailure(status, "clCreateCommandQueue", device.name) == CL_SUCCESS;
}

std::shared_ptr<Device> makeDevice(const std::string& choice, bool isTimed) {
    auto device = std::make_shared<Device>();
    device->id = chosenDevice(choice);
    device->isTimed = isTimed;
    return device->id && askAbilities(*device) && makeQueue(*device) ? device : nullptr;
}

} // namespace

Device::~Device() {
    if (queue)
        noteFailure(clReleaseCommandQueue(queue), "clReleaseCommandQueue");
    if (context)
        noteFailure(clReleaseContext(context), "clReleaseContext");
}

std::shared_ptr<Device> currentDevice() {
    const std::scoped_lock lock(state().mutex);
    if (!state().open)
        state().open = makeDevice(state().choice, state().isTimed);
    return state().open;
}

std::shared_ptr<Device> openDevice() {
    const std::scoped_lock lock(state().mutex);
    return state().open;
}

void closeDevice() {
    std::shared_ptr<Device> closed;
    {
        const std::scoped_lock lock(state().mutex);
        closed.swap(state().open);
    }
    if (!closed)
        return;
    if (closed->isTimed) {
        noteFailure(clFinish(closed->queue), "clFinish");
        timesMeasured();
    }
    forgetPrograms();
}

void setDeviceChoice(const std::string& choice) {
    {
        const std::scoped_lock lock(state().mutex);
        state().choice = choice;
    }
    closeDevice();
}

void setDeviceTiming(bool isTimed) {
    {
        const std::scoped_lock lock(state().mutex);
        if (state().isTimed == isTimed)
            return;
        state().isTimed = isTimed;
    }
    closeDevice();
}

} // namespace OpenQuarn
