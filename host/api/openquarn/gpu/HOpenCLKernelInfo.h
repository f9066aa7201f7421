// SPDX-License-Identifier: Apache-2.0
// Kernels, compiled from a file on first use.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HString.h"
#include "openquarn/HStringArray.h"
#include "openquarn/gpu/HOpenCLBuffer.h"
#include "openquarn/gpu/HOpenCLEvent.h"

#include <cstddef>
#include <memory>

/// One kernel object with its arguments and its work size. Not copyable. `[any]` throughout, one object for one thread
/// at a time: different objects may be of the same kernel.
class OPENQUARN_API HOpenCLKernelInfo {
public:
    HOpenCLKernelInfo() noexcept;
    ~HOpenCLKernelInfo();
    HOpenCLKernelInfo(const HOpenCLKernelInfo&) = delete;
    HOpenCLKernelInfo& operator=(const HOpenCLKernelInfo&) = delete;

    /// Brings the kernel up to date with its file, and sets the work size. The program is compiled once a process for
    /// each file, list of folders and device, and again when the file or one that it includes has another time or size;
    /// one that does not compile is tried again then too.
    /// `file` path of the OpenCL C source; `kernel` name of a kernel in it; `workItems` number of work items, may be 0;
    /// `includeDirectories` where its includes are looked for,
    /// after the folder of the file that includes; null: nowhere else.
    /// False when the file cannot be read or compiled, has no such kernel, or there is no device: the reason is kept
    /// for the host's message. There is no kernel then.
    bool loadOrUpdate(const HString& file, const HString& kernel, std::size_t workItems,
                      const HStringArray* includeDirectories = nullptr);
    bool isLoaded() const noexcept;
    /// Null when there is none. Stays this object's. Who asks may set arguments past it: from then on it sets each one
    /// anew, where it otherwise leaves those that have their value.
    cl_kernel kernel() const noexcept;
    std::size_t workItems() const noexcept;

    /// Sets argument `index` to the buffer, or to a null buffer when `isValid` is false or the buffer is null. Does
    /// nothing unless `status` is CL_SUCCESS; a failure is put into it.
    void setKernelArgBuffer(cl_uint index, const HOpenCLBuffer& buffer, cl_int& status, bool isValid = true);

    /// Enqueues the kernel on the host's default queue, for exactly workItems() work items. The host chooses the local
    /// size, at most 64; what is left over by whole groups runs as a second range of single items, so that a kernel
    /// goes by get_global_id(0), and not by the sizes that OpenCL gives it. With 0 work items nothing runs, and `done`
    /// comes with `waitFor`. `done` receives an event that comes after both; null: nobody asks.
    cl_int enqueueKernel(const HOpenCLEventList& waitFor, HOpenCLEvent* done);

    /// Lets go of the kernel; the compiled program stays.
    void reset() noexcept;

private:
    friend class HOpenCLUtils;
    struct Impl;
    std::unique_ptr<Impl> impl_; ///< null: no kernel
};
