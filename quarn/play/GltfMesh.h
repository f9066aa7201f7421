// SPDX-License-Identifier: Apache-2.0
// A mesh of a glTF file with its skin, part by part, as a reader has it before and after the skin.
#pragma once

#include "openquarn/HMatrix.h"
#include "quarn/character/GltfBytes.h"
#include "quarn/play/MorphClip.h"

#include <span>
#include <vector>

namespace quarn {

/// A primitive: its vertices follow those of the part before.
struct GltfPart {
    std::size_t first = 0, count = 0;
    bool hasNormals = false;
};

/// All vertices of all parts. Thread: any.
class GltfMesh {
public:
    /// The mesh that the node shows, in a document that has passed checkGltf(). Throws std::runtime_error with the
    /// reason when numbers are missing, damaged, or not finite, and for a mesh that is compressed by Draco.
    GltfMesh(const JsonValue& document, std::size_t node, GltfBytes& bytes);

    std::size_t vertexCount() const { return base_.points.size() / 3; }
    const std::vector<GltfPart>& parts() const { return parts_; }
    bool hasNormals() const;
    std::size_t targetCount() const { return targets_.size(); }
    /// With the file's own morph targets added; `weights` [targetCount()]. Normals are 0 where the file has none.
    ClipShape morphed(std::span<const float> weights) const;
    /// What the skin moves each vertex by, where the nodes of the file are in the world: the sum of its joints' inverse
    /// bind and world matrices by weight, for weights of the sum 1, as readers make them; without a skin the node's own
    /// matrix. A vertex without weights has zeros, but for the last 1.
    std::vector<HMatrix> blended(const std::vector<HMatrix>& worlds) const;

private:
    struct Influence {
        std::size_t joint = 0; ///< position in joints_
        double weight = 0.0;   ///< of the sum 1
    };
    void addPart(const JsonValue& document, const JsonValue& primitive, GltfBytes& bytes);
    void addTargets(const JsonValue& document, const JsonValue& primitive, const GltfPart& part, GltfBytes& bytes);
    void addInfluences(const JsonValue& document, const JsonValue& primitive, GltfBytes& bytes);
    void readSkin(const JsonValue& document, const JsonValue& skin, GltfBytes& bytes);

    std::size_t node_;
    bool isSkinned_ = false;
    std::vector<GltfPart> parts_;
    ClipShape base_;
    std::vector<ClipShape> targets_;
    std::vector<std::size_t> joints_; ///< nodes
    std::vector<HMatrix> inverseBinds_;
    std::vector<std::vector<Influence>> influences_; ///< by vertex; empty without a skin
};

} // namespace quarn
