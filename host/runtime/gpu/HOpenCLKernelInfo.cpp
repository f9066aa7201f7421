// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HOpenCLKernelInfo.h"

#include "core/Object.h"
#include "gpu/Buffer.h"
#include "gpu/Device.h"
#include "gpu/activity.h"
#include "gpu/failure.h"
#include "gpu/programs.h"
#include "openquarn/gpu/HOpenCLUtils.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <exception>
#include <string>
#include <utility>
#include <vector>

using OpenQuarn::noteFailure;

namespace {

/// What an argument was set to; nothing known of one with 0 bytes.
struct Argument {
    std::size_t bytes = 0;
    bool isBuffer = false;
    std::uint64_t value = 0; ///< a buffer's number, 0 for a null buffer
    bool operator==(const Argument&) const = default;
};

/// A value as large as a handle may be one, of something that comes and goes.
Argument argumentOf(std::size_t bytes, const void* value) {
    if (!value || bytes >= sizeof(cl_mem))
        return {};
    Argument argument{.bytes = bytes};
    std::memcpy(&argument.value, value, bytes);
    return argument;
}

cl_int noKernel(cl_uint index) {
    return noteFailure(CL_INVALID_KERNEL, "clSetKernelArg", "argument " + std::to_string(index));
}

} // namespace

struct HOpenCLKernelInfo::Impl {
    Impl() = default;
    ~Impl() {
        if (kernel)
            noteFailure(clReleaseKernel(kernel), "clReleaseKernel");
    }
    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;

    std::shared_ptr<const OpenQuarn::Program> program;
    std::string name;
    cl_kernel kernel = nullptr;
    std::size_t localSize = 1;
    std::size_t workItems = 0;
    std::vector<Argument> arguments; ///< as they are set
    bool isLent = false;             ///< others may have set them

    /// `argument` what the value is, if that is known.
    cl_int set(cl_uint index, std::size_t bytes, const void* value, const Argument& argument);
    bool create(const std::string& file);
    cl_int enqueue(const HOpenCLEventList& waitFor, HOpenCLEvent* done) const;
    cl_int enqueueRange(std::size_t begin, std::size_t count, std::size_t local, const HOpenCLEventList& waitFor,
                        HOpenCLEvent* done) const;
};

bool HOpenCLKernelInfo::Impl::create(const std::string& file) {
    constexpr std::size_t usualLocalSize = 64; // a multiple of what the devices run at once
    cl_int status = CL_SUCCESS;
    kernel = clCreateKernel(program->id, name.c_str(), &status);
    if (status != CL_SUCCESS) {
        noteFailure(status, "clCreateKernel", "kernel \"" + name + "\" of " + file);
        return false;
    }
    std::size_t largest = 0;
    status = clGetKernelWorkGroupInfo(kernel, program->device->id, CL_KERNEL_WORK_GROUP_SIZE, sizeof largest, &largest,
                                      nullptr);
    localSize = std::clamp<std::size_t>(largest, 1, usualLocalSize);
    return noteFailure(status, "clGetKernelWorkGroupInfo", name) == CL_SUCCESS;
}

cl_int HOpenCLKernelInfo::Impl::set(cl_uint index, std::size_t bytes, const void* value, const Argument& argument) {
    const bool isKept = index < arguments.size();
    if (!isLent && argument.bytes > 0 && isKept && arguments[index] == argument)
        return CL_SUCCESS;
    if (isKept)
        arguments[index] = {};
    const cl_int status = clSetKernelArg(kernel, index, bytes, value);
    if (status != CL_SUCCESS)
        return noteFailure(status, "clSetKernelArg", "argument " + std::to_string(index));
    if (!isKept)
        arguments.resize(std::size_t{index} + 1);
    arguments[index] = argument;
    return CL_SUCCESS;
}

// A global size is a multiple of the local one: whole groups first, then what is left, one by one. The queue is in
// order, so that the last event covers both.
cl_int HOpenCLKernelInfo::Impl::enqueue(const HOpenCLEventList& waitFor, HOpenCLEvent* done) const {
    const std::size_t left = workItems % localSize;
    const std::size_t grouped = workItems - left;
    cl_int status = CL_SUCCESS;
    if (grouped > 0)
        status = enqueueRange(0, grouped, localSize, waitFor, left > 0 ? nullptr : done);
    if (left > 0 && status == CL_SUCCESS)
        status = enqueueRange(grouped, left, 1, grouped > 0 ? HOpenCLEventList() : waitFor, done);
    return status;
}

cl_int HOpenCLKernelInfo::Impl::enqueueRange(std::size_t begin, std::size_t count, std::size_t local,
                                             const HOpenCLEventList& waitFor, HOpenCLEvent* done) const {
    const OpenQuarn::Device& device = *program->device;
    HOpenCLEvent ran;
    const bool isAsked = done || device.isTimed;
    const cl_int status = clEnqueueNDRangeKernel(device.queue, kernel, 1, &begin, &count, &local, waitFor.length(),
                                                 waitFor.data(), isAsked ? ran.receive() : nullptr);
    if (noteFailure(status, "clEnqueueNDRangeKernel", name) == CL_SUCCESS)
        OpenQuarn::timeCommand(device, name, ran.get());
    if (done)
        *done = std::move(ran);
    return status;
}

HOpenCLKernelInfo::HOpenCLKernelInfo() noexcept = default;
HOpenCLKernelInfo::~HOpenCLKernelInfo() = default;

bool HOpenCLKernelInfo::loadOrUpdate(const HString& file, const HString& kernel, std::size_t workItems,
                                     const HStringArray* includeDirectories) try {
    auto program = OpenQuarn::loadProgram(file.asStdString(), includeDirectories);
    if (!program) {
        reset();
        return false;
    }
    if (!impl_ || impl_->program != program || impl_->name != kernel.asStdString()) {
        impl_ = std::make_unique<Impl>();
        impl_->program = std::move(program);
        impl_->name = kernel.asStdString();
        if (!impl_->create(file.asStdString())) {
            reset();
            return false;
        }
    }
    impl_->workItems = workItems;
    return true;
} catch (const std::exception& error) {
    noteFailure(error.what());
    reset();
    return false;
}

bool HOpenCLKernelInfo::isLoaded() const noexcept {
    return impl_ != nullptr;
}
cl_kernel HOpenCLKernelInfo::kernel() const noexcept {
    if (!impl_)
        return nullptr;
    impl_->isLent = true;
    return impl_->kernel;
}
std::size_t HOpenCLKernelInfo::workItems() const noexcept {
    return impl_ ? impl_->workItems : 0;
}
void HOpenCLKernelInfo::reset() noexcept {
    impl_.reset();
}

void HOpenCLKernelInfo::setKernelArgBuffer(cl_uint index, const HOpenCLBuffer& buffer, cl_int& status, bool isValid) {
    const HOpenCLBuffer::Impl* of = isValid ? OpenQuarn::Access::impl(buffer).get() : nullptr;
    cl_mem memory = of ? of->memory : nullptr;
    constexpr std::size_t bytes = sizeof(cl_mem); // NOLINT(bugprone-sizeof-expression): a buffer is a pointer
    const Argument argument{.bytes = bytes, .isBuffer = true, .value = of ? of->number : 0};
    if (status == CL_SUCCESS)
        status = impl_ ? impl_->set(index, bytes, &memory, argument) : noKernel(index);
}

void HOpenCLUtils::setKernelArg(const HOpenCLKernelInfo& kernel, cl_uint index, std::size_t bytes, const void* value,
                                cl_int& status) {
    if (status == CL_SUCCESS)
        status = kernel.impl_ ? kernel.impl_->set(index, bytes, value, argumentOf(bytes, value)) : noKernel(index);
}

cl_int HOpenCLKernelInfo::enqueueKernel(const HOpenCLEventList& waitFor, HOpenCLEvent* done) {
    if (!impl_)
        return noteFailure(CL_INVALID_KERNEL, "clEnqueueNDRangeKernel", "no kernel is loaded");
    if (impl_->workItems == 0) {
        if (!done)
            return CL_SUCCESS;
        const OpenQuarn::Device& device = *impl_->program->device;
        HOpenCLEvent ran;
        const cl_int status =
            clEnqueueMarkerWithWaitList(device.queue, waitFor.length(), waitFor.data(), ran.receive());
        *done = std::move(ran);
        return noteFailure(status, "clEnqueueMarkerWithWaitList", impl_->name);
    }
    const cl_int status = impl_->enqueue(waitFor, done);
    if (status == CL_SUCCESS)
        OpenQuarn::countLaunch(impl_->name);
    return status;
}
