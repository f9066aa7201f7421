// SPDX-License-Identifier: Apache-2.0
// What goes into a GPU deformer and comes out of it: buffers, by plug and name.
#pragma once

#include "openquarn/HPlug.h"
#include "openquarn/HString.h"
#include "openquarn/gpu/HOpenCLBuffer.h"

#include <functional>
#include <vector>

/// `[eval]` throughout.
class OPENQUARN_API HGPUDeformerData {
public:
    HGPUDeformerData();
    ~HGPUDeformerData();
    HGPUDeformerData(const HGPUDeformerData&) = delete;
    HGPUDeformerData& operator=(const HGPUDeformerData&) = delete;

    /// The buffer of that name for the mesh of a plug; null when there is none. A mesh is evaluated, and uploaded, when
    /// it is asked for: `status` may be null, and receives CL_SUCCESS, or the status of what failed on the way to a
    /// buffer that there should be. A deformer that gets a failure there answers kDeformerFailure.
    HOpenCLBuffer getBuffer(const HPlug& plug, const HString& name, cl_int* status = nullptr) const;
    /// Replaces the one that is there. Throws std::bad_alloc in the caller.
    void setBuffer(const HPlug& plug, const HString& name, const HOpenCLBuffer& buffer);
    /// Gives the buffer when it is asked for: null, or with a failing status, as getBuffer() says.
    using Supplier = std::function<HOpenCLBuffer(cl_int& status)>;
    void setSupplier(const HPlug& plug, const HString& name, Supplier supplier);
    void clear() noexcept;

private:
    friend class HPxGPUStandardDeformer;
    struct Entry {
        HPlug plug;
        HString name;
        HOpenCLBuffer buffer;
        Supplier supplier; ///< empty: `buffer` it is
    };
    Entry& entryOf(const HPlug& plug, const HString& name);
    /// getBuffer() that leaves the upload for later.
    HOpenCLBuffer find(const HPlug& plug, const HString& name, cl_int& status) const;
    std::vector<Entry> entries_;
};
