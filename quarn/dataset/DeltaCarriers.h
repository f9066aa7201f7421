// SPDX-License-Identifier: Apache-2.0
// Where deltas lead to, for several kinds of deltas beside each other.
#pragma once

#include "quarn/dataset/DeltaKind.h"

#include "quill/IndexMapper.h"
#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"

#include <array>
#include <cstdint>
#include <span>
#include <vector>

namespace quarn {

struct MeshPolygons;

/// Of one vertex in one frame: a delta d leads to origin + d * turn (a row vector, object space, the scene's unit).
struct DeltaCarrier {
    quill::val3<float> origin;
    std::array<quill::val3<float>, 3> turn; ///< rows; a rotation, unless the smoothed surface has collapsed there

    quill::val3<float> place(const quill::val3<float>& delta) const {
        return origin + delta.x * turn[0] + delta.y * turn[1] + delta.z * turn[2];
    }
    /// The delta that leads to a point; as near to it as can be where no delta does.
    quill::val3<float> deltaTo(const quill::val3<float>& point) const;
};

/// Measures the carriers of some vertices: by the deformer's own smoothing and frames. Thread: one at a time.
class DeltaCarriers {
public:
    /// `rest` [3 * map.fullCount()] the mesh at rest; `vertices` those that are measured, affected indices; `kinds`
    /// in any order.
    DeltaCarriers(const MeshPolygons& polygons, std::span<const float> rest, const quill::IndexMapper& map,
                  std::vector<std::uint32_t> vertices, std::vector<DeltaKind> kinds);

    const std::vector<DeltaKind>& kinds() const { return kinds_; }
    std::size_t vertexCount() const { return vertices_.size(); }

    /// Of a frame; `skin` [3 * map.fullCount()] the points that come into the deformer.
    void measure(std::span<const float> skin);
    /// [vertexCount()] those of a kind, in the order of the vertices.
    const std::vector<DeltaCarrier>& of(std::size_t kind) const { return carriers_[kind]; }
    /// The point of each measured vertex.
    void pick(std::span<const float> xyz, std::vector<quill::val3<float>>& points) const;

private:
    using Points = std::vector<quill::val3<float>>;
    template <class Measure>
    void forEachSmoothing(Points points, const Measure& measure);
    Points affected(std::span<const float> xyz) const;
    void carry(std::size_t kind, const Points& smoothed);

    quill::IndexMapper map_;
    std::vector<std::uint32_t> vertices_;
    std::vector<DeltaKind> kinds_;
    Points rest_;
    quill::VertexConnections connections_;
    std::vector<float> weights_;
    quill::VertexFrames frames_;
    std::vector<std::vector<quill::mat4d>> restInverses_; ///< [kinds][vertices]
    std::vector<std::vector<DeltaCarrier>> carriers_;
    std::vector<quill::mat4d> scratch_;
};

} // namespace quarn
