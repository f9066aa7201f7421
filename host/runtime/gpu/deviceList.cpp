// SPDX-License-Identifier: Apache-2.0
#include "gpu/deviceList.h"

#include "gpu/failure.h"

#include <algorithm>
#include <charconv>

#include <unistd.h>

namespace OpenQuarn {
namespace {

constexpr cl_int noPlatform = -1001; // of the loader, when no platform is installed

// PoCL ends the whole process where it cannot find out what processor there is, as in a bare chroot.
bool maySeeDevices() {
#ifdef __linux__
    if (::access("/sys/devices/system/cpu", F_OK) != 0) {
        noteFailure("no OpenCL device was found: they are not looked for where there is no /sys");
        return false;
    }
#endif
    return true;
}

std::vector<cl_platform_id> platforms() {
    if (!maySeeDevices())
        return {};
    cl_uint count = 0;
    const cl_int status = clGetPlatformIDs(0, nullptr, &count);
    if (status != CL_SUCCESS || count == 0) {
        if (status != noPlatform)
            noteFailure(status, "clGetPlatformIDs");
        return {};
    }
    std::vector<cl_platform_id> found(count);
    if (noteFailure(clGetPlatformIDs(count, found.data(), nullptr), "clGetPlatformIDs") != CL_SUCCESS)
        return {};
    return found;
}

// `failure` receives what went wrong: one platform that is broken does not hide the others
std::vector<cl_device_id> devicesOf(cl_platform_id platform, cl_int& failure) {
    cl_uint count = 0;
    cl_int status = clGetDeviceIDs(platform, CL_DEVICE_TYPE_ALL, 0, nullptr, &count);
    std::vector<cl_device_id> found(status == CL_SUCCESS ? count : 0);
    if (!found.empty())
        status = clGetDeviceIDs(platform, CL_DEVICE_TYPE_ALL, count, found.data(), nullptr);
    if (status == CL_SUCCESS)
        return found;
    if (status != CL_DEVICE_NOT_FOUND)
        failure = status;
    return {};
}

template <class T>
T deviceValue(cl_device_id id, cl_device_info what) {
    T value{};
    // NOLINTNEXTLINE(bugprone-sizeof-expression): a platform is a pointer
    if (clGetDeviceInfo(id, what, sizeof(T), &value, nullptr) != CL_SUCCESS)
        return T{};
    return value;
}

// `ask(size, to, needed)` is one of OpenCL's questions that are answered by a text
template <class Ask>
std::string textOf(const Ask& ask) {
    std::size_t size = 0;
    if (ask(0, nullptr, &size) != CL_SUCCESS || size == 0)
        return {};
    std::string text(size, '\0');
    if (ask(size, text.data(), nullptr) != CL_SUCCESS)
        return {};
    text.resize(std::min(text.find('\0'), size));
    return text;
}

std::string deviceText(cl_device_id id, cl_device_info what) {
    return textOf(
        [&](std::size_t size, void* to, std::size_t* needed) { return clGetDeviceInfo(id, what, size, to, needed); });
}

std::string platformName(cl_device_id id) {
    const auto platform = deviceValue<cl_platform_id>(id, CL_DEVICE_PLATFORM);
    if (!platform)
        return {};
    return textOf([&](std::size_t size, void* to, std::size_t* needed) {
        return clGetPlatformInfo(platform, CL_PLATFORM_NAME, size, to, needed);
    });
}

bool isGpu(cl_device_id id) {
    return (deviceValue<cl_device_type>(id, CL_DEVICE_TYPE) & CL_DEVICE_TYPE_GPU) != 0;
}

std::string lower(std::string text) {
    for (char& letter : text)
        if (letter >= 'A' && letter <= 'Z')
            letter = static_cast<char>(letter - 'A' + 'a');
    return text;
}

std::optional<std::size_t> numberOf(const std::string& text) {
    std::size_t number = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc() && stop == end ? std::optional(number) : std::nullopt;
}

} // namespace

std::vector<cl_device_id> findDevices() {
    std::vector<cl_device_id> all;
    cl_int failure = CL_SUCCESS;
    for (cl_platform_id platform : platforms()) {
        const std::vector<cl_device_id> more = devicesOf(platform, failure);
        all.insert(all.end(), more.begin(), more.end());
    }
    std::stable_partition(all.begin(), all.end(), isGpu);
    if (all.empty()) {
        noteFailure(failure, "clGetDeviceIDs");
        noteFailure("no OpenCL device was found");
    }
    return all;
}

std::string deviceName(cl_device_id id) {
    return deviceText(id, CL_DEVICE_NAME);
}

GpuDevice describeDevice(cl_device_id id) {
    GpuDevice device;
    device.name = deviceName(id);
    device.platform = platformName(id);
    device.driver = deviceText(id, CL_DRIVER_VERSION);
    device.isGpu = isGpu(id);
    device.hasDoubles = deviceValue<cl_device_fp_config>(id, CL_DEVICE_DOUBLE_FP_CONFIG) != 0;
    device.memory = deviceValue<cl_ulong>(id, CL_DEVICE_GLOBAL_MEM_SIZE);
    return device;
}

std::optional<std::size_t> matchDevice(const std::vector<GpuDevice>& devices, const std::string& choice) {
    // digits that are no device's number may be a part of a name
    if (const auto number = numberOf(choice); number && *number < devices.size())
        return number;
    const std::string part = lower(choice);
    const auto hasPart = [&](const GpuDevice& device) {
        return lower(device.name).find(part) != std::string::npos ||
               lower(device.platform).find(part) != std::string::npos;
    };
    const auto found = std::find_if(devices.begin(), devices.end(), hasPart);
    if (found == devices.end())
        return std::nullopt;
    return static_cast<std::size_t>(found - devices.begin());
}

std::string listDevices(const std::vector<GpuDevice>& devices) {
    if (devices.empty())
        return "no OpenCL device was found";
    std::string text = "the OpenCL devices are";
    for (std::size_t i = 0; i < devices.size(); ++i) {
        text.append(i == 0 ? " " : ", ").append(std::to_string(i)).append(": ").append(devices[i].name);
        text.append(" (").append(devices[i].platform).append(")");
    }
    return text;
}

} // namespace OpenQuarn
