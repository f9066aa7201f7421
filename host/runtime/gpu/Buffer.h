// SPDX-License-Identifier: Apache-2.0
// What a handle on a buffer shares.
#pragma once

#include "openquarn/gpu/HOpenCLBuffer.h"

#include <cstddef>
#include <memory>

namespace OpenQuarn {
struct Device;
}

struct HOpenCLBuffer::Impl {
    Impl() = default;
    ~Impl();
    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;

    std::shared_ptr<OpenQuarn::Device> device;
    cl_mem memory = nullptr;
    std::size_t size = 0;
    std::size_t capacity = 0;
    HOpenCLEvent ready;

    // the host's copy of the last small upload, which the device reads until `copyRead`
    std::unique_ptr<std::byte[]> copy;
    std::size_t copyCapacity = 0;
    HOpenCLEvent copyRead;

    /// Waits until the device has read the copy.
    cl_int waitForCopy();
    /// Makes `copy` a place for `bytes` that nobody reads.
    cl_int takeCopy(std::size_t bytes);
};
