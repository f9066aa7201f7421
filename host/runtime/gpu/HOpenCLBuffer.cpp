// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HOpenCLBuffer.h"

#include "gpu/Buffer.h"
#include "gpu/Device.h"
#include "gpu/failure.h"

#include <atomic>
#include <exception>
#include <mutex>
#include <new>
#include <string>
#include <utility>
#include <vector>

using OpenQuarn::noteFailure;

namespace {

// for good: whoever cannot be waited for may still use it
void abandon(std::unique_ptr<std::byte[]> copy) {
    static auto& abandoned = *new std::vector<std::unique_ptr<std::byte[]>>;
    static std::mutex mutex;
    const std::scoped_lock lock(mutex);
    abandoned.push_back(std::move(copy));
}

std::uint64_t nextNumber() {
    static std::atomic<std::uint64_t> last{0};
    return ++last;
}

} // namespace

HOpenCLBuffer::Impl::Impl()
    : number(nextNumber()) {}

HOpenCLBuffer::Impl::~Impl() {
    if (waitForCopy() != CL_SUCCESS)
        abandon(std::move(copy));
    if (memory)
        noteFailure(clReleaseMemObject(memory), "clReleaseMemObject");
}

cl_int HOpenCLBuffer::Impl::waitForCopy() {
    if (copyDone.isNull())
        return CL_SUCCESS;
    cl_event event = copyDone.get();
    const cl_int status = noteFailure(clWaitForEvents(1, &event), "clWaitForEvents");
    if (status == CL_SUCCESS || status == CL_EXEC_STATUS_ERROR_FOR_EVENTS_IN_WAIT_LIST) // it is over, either way
        copyDone.reset();
    return status;
}

cl_int HOpenCLBuffer::Impl::takeCopy(std::size_t bytes) {
    staged = 0; // what nobody has asked for
    const cl_int status = waitForCopy();
    if (status != CL_SUCCESS || bytes <= copyCapacity)
        return status;
    copyCapacity = 0;
    copy.reset(new (std::nothrow) std::byte[bytes]);
    if (!copy)
        return noteFailure(CL_OUT_OF_HOST_MEMORY, "an upload's copy", std::to_string(bytes) + " bytes");
    copyCapacity = bytes;
    return CL_SUCCESS;
}

bool HOpenCLBuffer::isNull() const noexcept {
    return !impl_;
}
cl_mem HOpenCLBuffer::get() const noexcept {
    return impl_ ? impl_->memory : nullptr;
}
std::size_t HOpenCLBuffer::bufferSize() const noexcept {
    return impl_ ? impl_->size : 0;
}
std::size_t HOpenCLBuffer::capacity() const noexcept {
    return impl_ ? impl_->capacity : 0;
}

namespace {

cl_int allocate(HOpenCLBuffer::Impl& made, std::size_t bytes) {
    cl_int status = CL_SUCCESS;
    made.memory = clCreateBuffer(made.device->context, CL_MEM_READ_WRITE, bytes, nullptr, &status);
    if (status != CL_SUCCESS)
        return noteFailure(status, "clCreateBuffer", std::to_string(bytes) + " bytes");
    made.size = made.capacity = bytes;
    return CL_SUCCESS;
}

} // namespace

cl_int HOpenCLBuffer::ensureBufferSize(std::size_t bytes) try {
    const auto device = OpenQuarn::currentDevice();
    if (!device) {
        impl_.reset();
        return CL_DEVICE_NOT_FOUND;
    }
    if (impl_ && (impl_->device != device || impl_->capacity < bytes))
        impl_.reset();
    if (impl_)
        impl_->size = bytes;
    if (impl_ || bytes == 0)
        return CL_SUCCESS;
    auto made = std::make_shared<Impl>();
    made->device = device;
    const cl_int status = allocate(*made, bytes);
    if (status == CL_SUCCESS)
        impl_ = std::move(made);
    return status;
} catch (const std::exception& error) {
    impl_.reset();
    return noteFailure(CL_OUT_OF_HOST_MEMORY, "a buffer", error.what());
}

HOpenCLEvent HOpenCLBuffer::bufferReadyEvent() const {
    return impl_ ? impl_->ready : HOpenCLEvent();
}

void HOpenCLBuffer::setBufferReadyEvent(const HOpenCLEvent& event) {
    if (impl_)
        impl_->ready = event;
}

void HOpenCLBuffer::reset() noexcept {
    impl_.reset();
}
