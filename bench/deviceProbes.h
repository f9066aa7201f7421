// SPDX-License-Identifier: Apache-2.0
// What the OpenCL device in use gives at the moment, on the host's own queue.
#pragma once

#include "plugin/kernels/OpenCl.h"

#include <cstddef>
#include <map>

namespace bench {

// Throws std::runtime_error when a call fails, and when there is no device.
class DeviceProbes {
public:
    DeviceProbes();

    // Seconds that a launch of no work takes until it has been waited for.
    double timeEmptyLaunch();
    // Seconds on the device of a kernel that reads half the bytes and writes the other half. Needs Gpu::setTiming().
    double timeCopy(std::size_t bytes);
    // The same of a copy of that many bytes from one buffer to another, without a kernel.
    double timeBufferCopy(std::size_t bytes);

private:
    struct Ends {
        kernels::Owned<cl_mem> from, to;
    };
    Ends& endsOf(std::size_t bytes);

    kernels::Device device_;
    kernels::Owned<cl_kernel> empty_, copy_;
    std::map<std::size_t, Ends> ends_; // by size
};

} // namespace bench
