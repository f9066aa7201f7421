// SPDX-License-Identifier: Apache-2.0
// The nodes of a glTF file, and where a reader has them. Matrices are for row vectors: p' = p * M.
#pragma once

#include "openquarn/HMatrix.h"
#include "storage/Json.h"

#include <array>
#include <cstddef>
#include <vector>

namespace quarn {

/// A node's own transformation as its keys hold it, in single precision: scale, then rotation, then translation.
struct NodePose {
    std::array<float, 3> translation{};
    std::array<float, 4> rotation{0, 0, 0, 1}; ///< x, y, z, w
    std::array<float, 3> scale{1, 1, 1};

    HMatrix matrix() const;
};

/// The nearest pose; shear is left out. The rotation is the one of its two quaternions that is nearer to `like`'s.
NodePose poseOf(const HMatrix& matrix, const NodePose& like = {});

/// Thread: any.
class GltfNodes {
public:
    /// The document has passed checkGltf(). Throws std::runtime_error, naming the node, for a transformation that is
    /// none.
    explicit GltfNodes(const storage::JsonValue& document);

    std::size_t count() const { return rests_.size(); }
    /// The index of the parent; count() for a root.
    std::size_t parent(std::size_t node) const { return parents_[node]; }
    /// To the parent's space, as the file has it.
    const HMatrix& rest(std::size_t node) const { return rests_[node]; }
    /// To the world, of all nodes; `locals` to their parents, [count()].
    std::vector<HMatrix> worlds(const std::vector<HMatrix>& locals) const;
    const std::vector<HMatrix>& rests() const { return rests_; }

private:
    std::vector<std::size_t> parents_;
    std::vector<std::size_t> order_; ///< parents before their children
    std::vector<HMatrix> rests_;
};

} // namespace quarn
