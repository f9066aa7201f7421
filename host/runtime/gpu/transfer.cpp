// SPDX-License-Identifier: Apache-2.0
#include "gpu/transfer.h"

#include "core/Object.h"
#include "geometry/forRanges.h"
#include "gpu/Buffer.h"
#include "gpu/Device.h"
#include "gpu/activity.h"
#include "gpu/failure.h"
#include "openquarn/gpu/HOpenCLUtils.h"

#include <chrono>
#include <cstring>
#include <string>
#include <thread>
#include <utility>

namespace OpenQuarn {
namespace {

using Buffer = HOpenCLBuffer::Impl;

constexpr std::size_t bytesPerVertex = 3 * sizeof(float);
constexpr std::size_t small = std::size_t{1} << 18U; // copied through the host's own memory; what is more is mapped

Buffer& implOf(const HOpenCLBuffer& buffer) {
    return *Access::impl(buffer);
}

cl_int write(Buffer& buffer, cl_bool isBlocking, std::size_t bytes, const void* data, HOpenCLEvent& written) {
    return noteFailure(clEnqueueWriteBuffer(buffer.device->queue, buffer.memory, isBlocking, 0, bytes, data, 0, nullptr,
                                            written.receive()),
                       "clEnqueueWriteBuffer");
}

// Writes the host's copy, which is its own.
cl_int writeCopy(Buffer& buffer, std::size_t bytes, HOpenCLEvent& written) {
    const cl_int status = write(buffer, CL_FALSE, bytes, buffer.copy.get(), buffer.copyDone);
    written = buffer.copyDone; // a copy that cannot be made is noted; the queue keeps the order without it
    return status;
}

// What is large is not worth a second copy: the caller waits.
cl_int writeOwnCopy(Buffer& buffer, std::size_t bytes, const void* data, HOpenCLEvent& written) {
    constexpr std::size_t large = std::size_t{1} << 20U;
    if (bytes > large)
        return write(buffer, CL_TRUE, bytes, data, written);
    const cl_int status = buffer.takeCopy(bytes);
    if (status != CL_SUCCESS)
        return status;
    std::memcpy(buffer.copy.get(), data, bytes);
    return writeCopy(buffer, bytes, written);
}

cl_int writeAll(HOpenCLBuffer& buffer, std::string_view name, std::size_t bytes, const void* data, int mode) {
    Buffer& impl = implOf(buffer);
    HOpenCLEvent written;
    const cl_int status = mode == HOpenCLUtils::kKeepData ? write(impl, CL_FALSE, bytes, data, written)
                                                          : writeOwnCopy(impl, bytes, data, written);
    if (status != CL_SUCCESS)
        return status;
    countUpload(name, bytes);
    timeCommand(*impl.device, "upload", written.get());
    impl.ready = std::move(written);
    return CL_SUCCESS;
}

bool isUploadable(std::size_t bytes, const void* data, int mode) {
    if (mode != HOpenCLUtils::kKeepData && mode != HOpenCLUtils::kCopyData)
        noteFailure(CL_INVALID_VALUE, "upload", "mode " + std::to_string(mode));
    else if (!data && bytes > 0)
        noteFailure(CL_INVALID_VALUE, "upload", "no data for " + std::to_string(bytes) + " bytes");
    else
        return true;
    return false;
}

// A buffer that is mapped, until it is unmapped or this goes.
class Mapped {
public:
    Mapped(const Buffer& buffer, cl_map_flags flags, std::size_t bytes, HOpenCLEvent* mapped)
        : buffer_(buffer) {
        const HOpenCLEventList waitFor = {buffer.ready};
        cl_int status = CL_SUCCESS;
        at_ = clEnqueueMapBuffer(buffer.device->queue, buffer.memory, CL_TRUE, flags, 0, bytes, waitFor.length(),
                                 waitFor.data(), mapped ? mapped->receive() : nullptr, &status);
        status_ = noteFailure(status, "clEnqueueMapBuffer", flags == CL_MAP_READ ? "download" : "upload");
    }
    ~Mapped() {
        if (at_)
            unmap(nullptr);
    }
    Mapped(const Mapped&) = delete;
    Mapped& operator=(const Mapped&) = delete;

    cl_int status() const { return status_; }
    float* floats() const { return static_cast<float*>(at_); }
    cl_int unmap(HOpenCLEvent* done) {
        void* mapped = std::exchange(at_, nullptr);
        return noteFailure(clEnqueueUnmapMemObject(buffer_.device->queue, buffer_.memory, mapped, 0, nullptr,
                                                   done ? done->receive() : nullptr),
                           "clEnqueueUnmapMemObject");
    }

private:
    const Buffer& buffer_;
    void* at_ = nullptr;
    cl_int status_ = CL_SUCCESS;
};

void narrow(const Positions& positions, float* to) {
    const double* from = positions.xyz();
    forRanges(positions.vertexCount(), [=](std::size_t begin, std::size_t end) {
        for (std::size_t i = 3 * begin; i < 3 * end; ++i)
            to[i] = static_cast<float>(from[i]);
    });
}

cl_int writeMapped(const Positions& positions, Buffer& buffer, std::size_t bytes, HOpenCLEvent& written) {
    Mapped mapped(buffer, CL_MAP_WRITE_INVALIDATE_REGION, bytes, nullptr);
    if (mapped.status() != CL_SUCCESS)
        return mapped.status();
    narrow(positions, mapped.floats());
    return mapped.unmap(&written);
}

void positionsWritten(Buffer& buffer, std::size_t bytes, HOpenCLEvent written) {
    countUpload("positions", bytes);
    timeCommand(*buffer.device, "upload", written.get());
    buffer.ready = std::move(written);
}

// To map means to wait for the device, which takes longer than to copy what is small (decision 0099).
cl_int stage(const Positions& positions, Buffer& buffer) {
    const TimedStep step(*buffer.device, "upload");
    const std::size_t bytes = positions.vertexCount() * bytesPerVertex;
    HOpenCLEvent written;
    const cl_int status = bytes <= small ? buffer.takeCopy(bytes) : writeMapped(positions, buffer, bytes, written);
    if (status != CL_SUCCESS)
        return status;
    if (bytes > small) {
        positionsWritten(buffer, bytes, std::move(written));
        return CL_SUCCESS;
    }
    narrow(positions, reinterpret_cast<float*>(buffer.copy.get()));
    buffer.staged = bytes;
    buffer.ready = {};
    return CL_SUCCESS;
}

// So that the time of a download is not that of the kernels before it.
void waitWhenTimed(const Buffer& buffer) {
    if (!buffer.device->isTimed)
        return;
    const TimedStep step(*buffer.device, "wait");
    noteFailure(clFinish(buffer.device->queue), "clFinish");
}

void widen(const float* from, Positions& positions) {
    double* to = positions.xyz();
    forRanges(positions.vertexCount(), [=](std::size_t begin, std::size_t end) {
        for (std::size_t i = 3 * begin; i < 3 * end; ++i)
            to[i] = from[i];
    });
}

// Looks whether a command is over, for as long as it takes to put a thread to sleep and to wake it a few times (some
// 30 us each on a virtual machine): a small frame is over by then. Others run meanwhile, the device's threads among
// them. What fails here is told by whoever waits.
void pollBriefly(const Device& device, const HOpenCLEvent& command) {
    constexpr std::chrono::microseconds longest(100);
    if (clFlush(device.queue) != CL_SUCCESS)
        return;
    cl_int state = CL_QUEUED;
    for (const auto start = std::chrono::steady_clock::now(); std::chrono::steady_clock::now() - start < longest;) {
        if (clGetEventInfo(command.get(), CL_EVENT_COMMAND_EXECUTION_STATUS, sizeof state, &state, nullptr) !=
                CL_SUCCESS ||
            state <= CL_COMPLETE)
            return;
        std::this_thread::yield();
    }
}

cl_int readCopy(Buffer& buffer, std::size_t bytes, Positions& positions, HOpenCLEvent* read) {
    cl_int status = buffer.takeCopy(bytes);
    if (status != CL_SUCCESS)
        return status;
    const HOpenCLEventList waitFor = {buffer.ready};
    status = noteFailure(clEnqueueReadBuffer(buffer.device->queue, buffer.memory, CL_FALSE, 0, bytes, buffer.copy.get(),
                                             waitFor.length(), waitFor.data(), buffer.copyDone.receive()),
                         "clEnqueueReadBuffer", "download");
    if (status != CL_SUCCESS)
        return status;
    if (read)
        *read = buffer.copyDone;
    pollBriefly(*buffer.device, buffer.copyDone);
    status = buffer.waitForCopy();
    if (status == CL_SUCCESS)
        widen(reinterpret_cast<const float*>(buffer.copy.get()), positions);
    return status;
}

cl_int readMapped(const Buffer& buffer, std::size_t bytes, Positions& positions, HOpenCLEvent* read) {
    Mapped mapped(buffer, CL_MAP_READ, bytes, read);
    if (mapped.status() != CL_SUCCESS)
        return mapped.status();
    widen(mapped.floats(), positions);
    return mapped.unmap(nullptr);
}

// What is mapped has to be given back, which is another command for the device.
cl_int readPositions(Buffer& buffer, Positions& positions) {
    waitWhenTimed(buffer);
    const TimedStep step(*buffer.device, "download");
    const std::size_t bytes = positions.vertexCount() * bytesPerVertex;
    HOpenCLEvent event;
    HOpenCLEvent* read = buffer.device->isTimed ? &event : nullptr;
    const cl_int status =
        bytes <= small ? readCopy(buffer, bytes, positions, read) : readMapped(buffer, bytes, positions, read);
    if (status != CL_SUCCESS)
        return status;
    countDownload(bytes);
    timeCommand(*buffer.device, "download", event.get());
    return CL_SUCCESS;
}

} // namespace

cl_int uploadNamed(std::string_view name, std::size_t bytes, const void* data, HOpenCLBuffer& buffer, int mode) {
    cl_int status = isUploadable(bytes, data, mode) ? buffer.ensureBufferSize(bytes) : CL_INVALID_VALUE;
    if (status == CL_SUCCESS && bytes > 0)
        status = writeAll(buffer, name, bytes, data, mode);
    else if (status == CL_SUCCESS)
        buffer.setBufferReadyEvent({});
    if (status != CL_SUCCESS)
        buffer.reset();
    return status;
}

cl_int stagePositions(const Positions& positions, HOpenCLBuffer& buffer) {
    const std::size_t bytes = positions.vertexCount() * bytesPerVertex;
    cl_int status = buffer.ensureBufferSize(bytes);
    if (status == CL_SUCCESS && bytes > 0)
        status = stage(positions, implOf(buffer));
    else if (status == CL_SUCCESS)
        buffer.setBufferReadyEvent({});
    if (status != CL_SUCCESS)
        buffer.reset();
    return status;
}

cl_int writeStaged(const HOpenCLBuffer& buffer) {
    if (buffer.isNull() || implOf(buffer).staged == 0)
        return CL_SUCCESS;
    Buffer& impl = implOf(buffer);
    const TimedStep step(*impl.device, "upload");
    HOpenCLEvent written;
    const cl_int status = writeCopy(impl, impl.staged, written);
    if (status != CL_SUCCESS)
        return status;
    positionsWritten(impl, std::exchange(impl.staged, 0), std::move(written));
    return CL_SUCCESS;
}

cl_int downloadPositions(const HOpenCLBuffer& buffer, Positions& positions) {
    const std::size_t bytes = positions.vertexCount() * bytesPerVertex;
    if (bytes == 0)
        return CL_SUCCESS;
    if (buffer.bufferSize() < bytes)
        return noteFailure(CL_INVALID_BUFFER_SIZE, "download",
                           std::to_string(bytes) + " bytes from a buffer of " + std::to_string(buffer.bufferSize()));
    return readPositions(implOf(buffer), positions);
}

} // namespace OpenQuarn
