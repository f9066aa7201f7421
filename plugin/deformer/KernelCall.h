// SPDX-License-Identifier: Apache-2.0
// One launch of a kernel, its arguments in their order.
#pragma once

#include "openquarn/gpu/HOpenCLUtils.h"

namespace neuralWarp {

/// `[eval]` throughout.
class KernelCall {
public:
    /// `kernel` outlives the call. `after` has to have happened before the kernel runs; may be null.
    KernelCall(HOpenCLKernelInfo& kernel, const HOpenCLEvent& after)
        : kernel_(kernel) {
        waitFor_.append(after);
    }

    /// A buffer, which has to be ready first, or a null buffer when `isValid` is false.
    KernelCall& buffer(const HOpenCLBuffer& buffer, bool isValid = true) {
        kernel_.setKernelArgBuffer(index_++, buffer, status_, isValid);
        if (isValid)
            waitFor_.append(buffer.bufferReadyEvent());
        return *this;
    }
    /// A buffer that the kernel can do without, and that there never is.
    KernelCall& nullBuffer() { return buffer({}, false); }
    template <class Value>
    KernelCall& value(Value value) {
        HOpenCLUtils::setKernelArg(kernel_, index_++, sizeof value, &value, status_);
        return *this;
    }

    /// Replaces the event by that of the kernel. After an argument that could not be set nothing is enqueued: its
    /// status comes back.
    cl_int enqueue(HOpenCLEvent& event) {
        return status_ == CL_SUCCESS ? kernel_.enqueueKernel(waitFor_, &event) : status_;
    }
    /// The same without an event, for what comes next in the queue anyway.
    cl_int enqueue() { return status_ == CL_SUCCESS ? kernel_.enqueueKernel(waitFor_, nullptr) : status_; }

private:
    HOpenCLKernelInfo& kernel_;
    HOpenCLEventList waitFor_;
    cl_uint index_ = 0;
    cl_int status_ = CL_SUCCESS;
};

} // namespace neuralWarp
