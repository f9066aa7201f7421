// SPDX-License-Identifier: Apache-2.0
#include "deviceProbes.h"

#include "openquarn/gpu/HOpenCLEvent.h"
#include "openquarn/gpu/HOpenCLInfo.h"

#include <algorithm>
#include <chrono>
#include <stdexcept>

namespace bench {
namespace {

using kernels::check;

constexpr std::size_t localSize = 64;
const char* const source = "kernel void empty(uint unused) {}"
                           "kernel void copy(global float4* restrict to, global const float4* restrict from,"
                           "                 uint count) {"
                           "  const uint i = get_global_id(0);"
                           "  if (i < count) to[i] = from[i];"
                           "}";

kernels::Device hostsDevice() {
    kernels::Device device;
    cl_command_queue queue = HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue();
    if (!queue)
        throw std::runtime_error("there is no OpenCL device");
    cl_context context = nullptr;
    check(clGetCommandQueueInfo(queue, CL_QUEUE_DEVICE, sizeof(cl_device_id), &device.id, nullptr),
          "clGetCommandQueueInfo");
    check(clGetCommandQueueInfo(queue, CL_QUEUE_CONTEXT, sizeof(cl_context), &context, nullptr),
          "clGetCommandQueueInfo");
    check(clRetainCommandQueue(queue), "clRetainCommandQueue");
    device.queue.reset(queue);
    check(clRetainContext(context), "clRetainContext");
    device.context.reset(context);
    return device;
}

kernels::Owned<cl_mem> allocate(const kernels::Device& device, std::size_t bytes) {
    cl_int status = CL_SUCCESS;
    kernels::Owned<cl_mem> memory(clCreateBuffer(device.context.get(), CL_MEM_READ_WRITE, bytes, nullptr, &status));
    check(status, "clCreateBuffer");
    constexpr cl_float zero = 0.0F; // so that there is memory behind it
    check(clEnqueueFillBuffer(device.queue.get(), memory.get(), &zero, sizeof zero, 0, bytes, 0, nullptr, nullptr),
          "clEnqueueFillBuffer");
    return memory;
}

double secondsOf(const HOpenCLEvent& event) {
    cl_event handle = event.get();
    cl_ulong start = 0, end = 0;
    check(clWaitForEvents(1, &handle), "clWaitForEvents");
    check(clGetEventProfilingInfo(handle, CL_PROFILING_COMMAND_START, sizeof start, &start, nullptr),
          "clGetEventProfilingInfo");
    check(clGetEventProfilingInfo(handle, CL_PROFILING_COMMAND_END, sizeof end, &end, nullptr),
          "clGetEventProfilingInfo");
    return static_cast<double>(end - start) * 1e-9;
}

} // namespace

DeviceProbes::DeviceProbes()
    : device_(hostsDevice()) {
    const kernels::Program program = kernels::Program::fromText(device_, "probes", source);
    empty_ = program.kernel("empty");
    copy_ = program.kernel("copy");
    kernels::Arguments(empty_.get()).add(std::uint32_t{0});
}

double DeviceProbes::timeEmptyLaunch() {
    const auto start = std::chrono::steady_clock::now();
    kernels::enqueue(device_, empty_.get(), 1, localSize);
    kernels::finish(device_);
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

DeviceProbes::Ends& DeviceProbes::endsOf(std::size_t bytes) {
    Ends& ends = ends_[bytes];
    if (!ends.to)
        ends = {allocate(device_, bytes), allocate(device_, bytes)};
    return ends;
}

double DeviceProbes::timeCopy(std::size_t bytes) {
    constexpr std::size_t vectorBytes = sizeof(cl_float4);
    const std::size_t count = std::max<std::size_t>(bytes / 2 / vectorBytes, 1);
    const Ends& ends = endsOf(count * vectorBytes);
    cl_mem to = ends.to.get(), from = ends.from.get();
    kernels::Arguments(copy_.get())
        .add(&to, sizeof(cl_mem))
        .add(&from, sizeof(cl_mem))
        .add(static_cast<std::uint32_t>(count));
    const std::size_t global = (count + localSize - 1) / localSize * localSize;
    HOpenCLEvent event;
    check(clEnqueueNDRangeKernel(device_.queue.get(), copy_.get(), 1, nullptr, &global, &localSize, 0, nullptr,
                                 event.receive()),
          "clEnqueueNDRangeKernel");
    return secondsOf(event);
}

double DeviceProbes::timeBufferCopy(std::size_t bytes) {
    const Ends& ends = endsOf(bytes);
    HOpenCLEvent event;
    check(clEnqueueCopyBuffer(device_.queue.get(), ends.from.get(), ends.to.get(), 0, 0, bytes, 0, nullptr,
                              event.receive()),
          "clEnqueueCopyBuffer");
    return secondsOf(event);
}

} // namespace bench
