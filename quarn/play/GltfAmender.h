// SPDX-License-Identifier: Apache-2.0
// Puts a motion into a glTF file and leaves all else of it as it is.
#pragma once

#include "quarn/character/sourceGltf.h"
#include "quarn/play/GltfMesh.h"
#include "quarn/play/JointTracks.h"

#include <iosfwd>
#include <set>
#include <string>
#include <vector>

namespace quarn {

/// Adds accessors and views behind those that there are, targets to a mesh, and an animation in front of the others.
/// All throw std::runtime_error when the file becomes larger than a .glb can be. Thread: one.
class GltfAmender {
public:
    /// `source` is changed, and must live as long.
    explicit GltfAmender(SourceGltf& source);

    /// Adds morph targets to the mesh that the node shows, which has these parts and `known` targets already. A mesh
    /// that other nodes show as well becomes two. Targets [vertices of all parts]; their normals may be empty.
    void addTargets(std::size_t node, const std::vector<GltfPart>& parts, std::size_t known,
                    const std::vector<ClipTarget>& targets);

    /// The animation that is added: keys of all tracks at the same times.
    void beginAnimation(const std::string& name, const std::vector<float>& seconds);
    void addTrack(const GltfNodes& nodes, const JointTrack& track);
    /// `weights` [times][targets of the node's mesh].
    void addWeights(std::size_t node, const std::vector<float>& weights);
    /// Takes the tracks of other animations away that move these nodes, or the weights there, and animations that have
    /// no others. Gives a sentence for each animation.
    std::vector<std::string> endAnimation(const std::set<std::size_t>& moved, const std::set<std::size_t>& weighted);

    /// The whole file, binary. The stream must be in the classic locale.
    void write(std::ostream& out);

private:
    unsigned add(const char* type, std::size_t width, std::span<const float> numbers, bool isBounded);
    JsonValue& ownMesh(std::size_t node);
    JsonValue targetOf(const GltfPart& part, const ClipShape& shape);
    void nameTargets(JsonValue& mesh, std::size_t known, const std::vector<ClipTarget>& targets);
    void addChannel(std::size_t node, const char* path, unsigned keys);
    JsonValue list(std::span<const float> numbers);

    SourceGltf& source_;
    std::string numbers_; ///< behind the source's
    JsonValue animation_;
    unsigned times_ = 0; ///< accessor
};

} // namespace quarn
