// SPDX-License-Identifier: Apache-2.0
// Buffers on the device.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/gpu/HOpenCLEvent.h"

#include <cstddef>
#include <memory>

/// A handle on a buffer of the host's device; copies share the buffer, which is released with the last of them. A new
/// handle has none. `[any]` throughout; one buffer is for one thread at a time.
class OPENQUARN_API HOpenCLBuffer {
public:
    HOpenCLBuffer() noexcept = default;

    /// True when there is no OpenCL buffer behind it.
    bool isNull() const noexcept;
    /// Null when isNull(). Stays the handle's.
    cl_mem get() const noexcept;
    /// Bytes that are in use: what ensureBufferSize() or an upload asked for last. 0 when null.
    std::size_t bufferSize() const noexcept;
    /// Bytes that are allocated: never fewer than before, until reset() or a change of the device.
    std::size_t capacity() const noexcept;

    /// Makes room for `bytes`, of which nothing is written. A buffer that has it already, on the device in use, is
    /// kept, with its contents; else there is a new one, for this handle alone. 0 bytes keep what is allocated, and
    /// allocate nothing. Answers with CL_SUCCESS, or the status of the OpenCL call that failed; the handle is null
    /// then.
    cl_int ensureBufferSize(std::size_t bytes);

    /// What has to have happened before the buffer is read; null: nothing. An upload sets it.
    HOpenCLEvent bufferReadyEvent() const;
    /// Whoever enqueues work that writes the buffer says so. Does nothing when null.
    void setBufferReadyEvent(const HOpenCLEvent& event);

    /// Lets go of the buffer.
    void reset() noexcept;

    struct Impl; ///< the runtime's
private:
    friend class OpenQuarn::Access;
    std::shared_ptr<Impl> impl_;
};
