// SPDX-License-Identifier: Apache-2.0
// What a handle on a buffer shares.
#pragma once

#include "openquarn/gpu/HOpenCLBuffer.h"

#include <cstddef>
#include <cstdint>
#include <memory>

namespace OpenQuarn {
struct Device;
}

struct HOpenCLBuffer::Impl {
    Impl();
    ~Impl();
    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;

    const std::uint64_t number; ///< unique in the process, which a cl_mem is not once it was released; never 0
    std::shared_ptr<OpenQuarn::Device> device;
    cl_mem memory = nullptr;
    std::size_t size = 0;
    std::size_t capacity = 0;
    HOpenCLEvent ready;

    // the host's copy of the last small upload or download, which is the device's until `copyDone`
    std::unique_ptr<std::byte[]> copy;
    std::size_t copyCapacity = 0;
    HOpenCLEvent copyDone;
    std::size_t staged = 0; ///< bytes of the copy that are yet to be written to the device (transfer.h)

    /// Waits until the device is done with the copy.
    cl_int waitForCopy();
    /// Makes `copy` a place for `bytes` that is nobody else's.
    cl_int takeCopy(std::size_t bytes);
};
