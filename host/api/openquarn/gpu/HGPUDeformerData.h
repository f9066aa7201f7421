// SPDX-License-Identifier: Apache-2.0
// What goes into a GPU deformer and comes out of it: buffers, by plug and name.
#pragma once

#include "openquarn/HPlug.h"
#include "openquarn/HString.h"
#include "openquarn/gpu/HOpenCLBuffer.h"

#include <vector>

/// `[eval]` throughout.
class OPENQUARN_API HGPUDeformerData {
public:
    HGPUDeformerData();
    ~HGPUDeformerData();
    HGPUDeformerData(const HGPUDeformerData&) = delete;
    HGPUDeformerData& operator=(const HGPUDeformerData&) = delete;

    /// The buffer of that name for the mesh of a plug; null when there is none.
    HOpenCLBuffer getBuffer(const HPlug& plug, const HString& name) const;
    /// Replaces the one that is there. Throws std::bad_alloc in the caller.
    void setBuffer(const HPlug& plug, const HString& name, const HOpenCLBuffer& buffer);
    void clear() noexcept;

private:
    struct Entry;
    std::vector<Entry> entries_;
};
