// SPDX-License-Identifier: Apache-2.0
// What the frames of one geometry keep from one to the next.
#pragma once

#include "frame/FrameArrays.h"
#include "frame/FrameModel.h"
#include "quill/Smoother.h"
#include "quill/SurfaceTransport.h"

#include <cstdint>
#include <vector>

namespace neuralWarp {

/// The tables of a geometry at rest, laid out for its frames, and the arrays in which a frame works: its own, or those
/// that LentArrays lends it. Belongs to one geometry. One thread at a time.
class FrameWorkspace : public FrameArrays {
public:
    /// Something that a FrameModel views has changed: the next frame lays the tables out anew. [any]
    void invalidate() { isSmootherDue_ = isTransportDue_ = areBlocksDue_ = true; }
    /// The tables for `model`, as they were laid out or made now. Those that do not fit the vertices are empty. Throw
    /// std::bad_alloc.
    const quill::Smoother& smoother(const FrameModel& model);
    const quill::SurfaceTransport& transport(const FrameModel& model);
    /// The blocks of the basis in which a driven vertex has its slot, ascending. Not for an identity.
    const std::vector<std::uint32_t>& drivenBlocks(const FrameModel& model);
    /// Size of the tables and arrays, in bytes.
    std::size_t bytes() const;

private:
    bool isSmootherDue_ = true, isTransportDue_ = true, areBlocksDue_ = true;
    quill::Smoother smoother_;
    quill::SurfaceTransport transport_;
    std::vector<std::uint32_t> drivenBlocks_;
};

} // namespace neuralWarp
