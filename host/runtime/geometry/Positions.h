// SPDX-License-Identifier: Apache-2.0
// The points of a mesh as the host stores them, and the buffers they come from.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>

namespace OpenQuarn {

class PositionPool;

struct FreeMemory {
    void operator()(double* memory) const noexcept;
};
/// Aligned to large pages where it is as large as one, which it then asks for.
using PositionBuffer = std::unique_ptr<double[], FreeMemory>;

/// x, y, z of each vertex as doubles, object space. Written by the one who made it, and by nobody once a mesh shares
/// it.
class Positions {
public:
    /// Not initialised. `pool` gets the buffer back; may be null.
    Positions(std::size_t vertexCount, PositionBuffer buffer, std::weak_ptr<PositionPool> pool);
    ~Positions();
    Positions(const Positions&) = delete;
    Positions& operator=(const Positions&) = delete;

    std::size_t vertexCount() const { return vertexCount_; }
    double* xyz() { return xyz_.get(); } ///< 3 * vertexCount() values
    const double* xyz() const { return xyz_.get(); }
    /// Unique in the process: equal versions are the same positions.
    std::uint64_t version() const { return version_; }
    /// Bit by bit, but for a quick answer for itself.
    bool sameAs(const Positions& other) const;

private:
    const std::size_t vertexCount_;
    const std::uint64_t version_;
    PositionBuffer xyz_;
    const std::weak_ptr<PositionPool> pool_;
};

/// Keeps the last buffer that came back, so that whoever writes new positions in every evaluation takes no memory for
/// them: while one buffer is read further down, the one before is written. Thread: any.
class PositionPool : public std::enable_shared_from_this<PositionPool> {
public:
    std::shared_ptr<Positions> take(std::size_t vertexCount);

private:
    friend class Positions;
    void giveBack(PositionBuffer buffer, std::size_t vertexCount) noexcept;

    std::mutex mutex_;
    PositionBuffer spare_;
    std::size_t spareCount_ = 0;
};

/// Not initialised, from no pool.
std::shared_ptr<Positions> newPositions(std::size_t vertexCount);

} // namespace OpenQuarn
