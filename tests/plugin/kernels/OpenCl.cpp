// SPDX-License-Identifier: Apache-2.0
#include "OpenCl.h"

#include <algorithm>
#include <fstream>
#include <iterator>
#include <stdexcept>

namespace kernels {
namespace {

constexpr std::size_t guardBytes = 4096; // a multiple of any alignment of sub-buffers

std::string readSource(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    if (!file)
        throw std::runtime_error(path + " cannot be read");
    return {std::istreambuf_iterator<char>(file), {}};
}

template <typename T>
T deviceInfo(cl_device_id id, cl_device_info what) {
    T value{};
    check(clGetDeviceInfo(id, what, sizeof value, &value, nullptr), "clGetDeviceInfo");
    return value;
}

cl_device_id firstDevice() {
    cl_platform_id platforms[16];
    cl_uint count = 0;
    if (clGetPlatformIDs(16, platforms, &count) != CL_SUCCESS)
        return nullptr;
    for (cl_platform_id platform : std::span(platforms, std::min(count, 16U)))
        if (cl_device_id id = nullptr; clGetDeviceIDs(platform, CL_DEVICE_TYPE_ALL, 1, &id, nullptr) == CL_SUCCESS)
            return id;
    return nullptr;
}

} // namespace

void check(cl_int status, const char* call) {
    if (status != CL_SUCCESS)
        throw std::runtime_error(std::string(call) + ": " + std::to_string(status));
}

const char* folder() {
    return NW_KERNELS;
}

std::unique_ptr<Device> Device::first() {
    auto device = std::make_unique<Device>();
    device->id = firstDevice();
    if (!device->id)
        return nullptr;
    cl_int status = CL_SUCCESS;
    device->context.reset(clCreateContext(nullptr, 1, &device->id, nullptr, nullptr, &status));
    check(status, "clCreateContext");
    device->queue.reset(clCreateCommandQueue(device->context.get(), device->id, 0, &status));
    check(status, "clCreateCommandQueue");
    return device;
}

bool Device::hasDoubles() const {
    return deviceInfo<cl_device_fp_config>(id, CL_DEVICE_DOUBLE_FP_CONFIG) != 0;
}

bool Device::isExact() const {
    return (deviceInfo<cl_device_fp_config>(id, CL_DEVICE_SINGLE_FP_CONFIG) & CL_FP_CORRECTLY_ROUNDED_DIVIDE_SQRT) != 0;
}

bool Device::keepsDenormals() const {
    return (deviceInfo<cl_device_fp_config>(id, CL_DEVICE_SINGLE_FP_CONFIG) & CL_FP_DENORM) != 0;
}

Program::Program(const Device& device, const std::string& file, bool withIncludes, const std::string& options)
    : Program(fromText(device, file, readSource(NW_KERNELS "/" + file),
                       (withIncludes ? "-I " NW_KERNELS " " : "") + options)) {}

Program Program::fromText(const Device& device, const std::string& name, const std::string& text,
                          const std::string& options) {
    Program program;
    const char* source = text.c_str();
    cl_int status = CL_SUCCESS;
    program.program_.reset(clCreateProgramWithSource(device.context.get(), 1, &source, nullptr, &status));
    check(status, "clCreateProgramWithSource");
    const std::string all = options + (device.isExact() ? " -cl-fp32-correctly-rounded-divide-sqrt" : "");
    const cl_int built = clBuildProgram(program.program_.get(), 1, &device.id, all.c_str(), nullptr, nullptr);
    char log[16384] = {};
    check(clGetProgramBuildInfo(program.program_.get(), device.id, CL_PROGRAM_BUILD_LOG, sizeof log, log, nullptr),
          "clGetProgramBuildInfo");
    if (built != CL_SUCCESS)
        throw std::runtime_error(name + ": clBuildProgram: " + std::to_string(built) + "\n" + log);
    program.log_ = log;
    return program;
}

Owned<cl_kernel> Program::kernel(const char* name) const {
    cl_int status = CL_SUCCESS;
    Owned<cl_kernel> kernel(clCreateKernel(program_.get(), name, &status));
    check(status, name);
    return kernel;
}

Buffer::Buffer(const Device& device, const void* contents, std::size_t bytes)
    : device_(device)
    , bytes_(bytes) {
    std::vector<unsigned char> guarded(bytes + 2 * guardBytes, 0xFF);
    cl_int status = CL_SUCCESS;
    whole_.reset(clCreateBuffer(device.context.get(), CL_MEM_READ_WRITE | CL_MEM_COPY_HOST_PTR, guarded.size(),
                                guarded.data(), &status));
    check(status, "clCreateBuffer");
    // nothing has no region of its own: a byte of the guard stands for it
    const cl_buffer_region region{guardBytes, std::max<std::size_t>(bytes, 1)};
    payload_.reset(clCreateSubBuffer(whole_.get(), CL_MEM_READ_WRITE, CL_BUFFER_CREATE_TYPE_REGION, &region, &status));
    check(status, "clCreateSubBuffer");
    write(contents);
}

void Buffer::write(const void* contents) {
    const auto* bytes = static_cast<const unsigned char*>(contents);
    written_.assign(bytes, bytes + bytes_);
    if (bytes_ > 0)
        check(clEnqueueWriteBuffer(device_.queue.get(), payload_.get(), CL_TRUE, 0, bytes_, contents, 0, nullptr,
                                   nullptr),
              "clEnqueueWriteBuffer");
}

void Buffer::readPayload(void* to) const {
    if (bytes_ > 0)
        check(clEnqueueReadBuffer(device_.queue.get(), payload_.get(), CL_TRUE, 0, bytes_, to, 0, nullptr, nullptr),
              "clEnqueueReadBuffer");
}

bool Buffer::guardsAreWhole() const {
    std::vector<unsigned char> guards(2 * guardBytes);
    for (const std::size_t end : {std::size_t{0}, std::size_t{1}})
        check(clEnqueueReadBuffer(device_.queue.get(), whole_.get(), CL_TRUE, end * (guardBytes + bytes_), guardBytes,
                                  guards.data() + end * guardBytes, 0, nullptr, nullptr),
              "clEnqueueReadBuffer");
    return std::all_of(guards.begin(), guards.end(), [](unsigned char byte) { return byte == 0xFF; });
}

bool Buffer::isUnchanged() const {
    return read<unsigned char>() == written_;
}

Arguments& Arguments::add(const Buffer* buffer) {
    cl_mem handle = buffer ? buffer->handle() : nullptr;
    return add(&handle, sizeof(cl_mem));
}

Arguments& Arguments::add(const void* value, std::size_t size) {
    check(clSetKernelArg(kernel_, index_++, size, value), "clSetKernelArg");
    return *this;
}

void enqueue(const Device& device, cl_kernel kernel, std::size_t n, std::size_t local) {
    const std::size_t global = (n + local - 1) / local * local;
    check(clEnqueueNDRangeKernel(device.queue.get(), kernel, 1, nullptr, &global, &local, 0, nullptr, nullptr),
          "clEnqueueNDRangeKernel");
}

void finish(const Device& device) {
    check(clFinish(device.queue.get()), "clFinish");
}

} // namespace kernels
