// SPDX-License-Identifier: Apache-2.0
// A motion put into the glTF file that the mesh was imported from: materials, pictures, skin, nodes and other meshes
// stay; morph targets and an animation are added.
#pragma once

#include "quarn/play/AnimatedFile.h"
#include "quarn/play/JointTracks.h"
#include "quarn/play/beforeSkin.h"
#include "storage/WholeFile.h"

namespace quarn {

/// In glTF targets act before the skin, and what a deformer does comes after it: each frame's points are brought back
/// through the skin, as a reader of the file has it in that frame. Frames are kept until finish(): 36 bytes a vertex
/// and frame. Thread: main, with the scene at each frame while it is added, as the skeleton is read there.
class SourceClip : public AnimatedFile {
public:
    /// `motion.source` is not null.
    SourceClip(const std::filesystem::path& path, MeshPolygons polygons, ClipMotion motion);

    std::uint64_t expectedBytes() const override;
    void add(int frame, std::span<const float> xyz) override;
    void finish() override;
    std::optional<ShapesOfMotion> shapes() const override { return shapes_; }
    std::vector<std::string> notes() const override { return notes_; }

private:
    /// Targets, and the weights of each in every frame.
    struct Added {
        std::vector<ClipTarget> targets;
        std::vector<float> weights; ///< [frames][targets]
    };
    const GltfMesh& mesh() const { return *motion_.source->mesh; }
    const GltfNodes& nodes() const { return *motion_.source->nodes; }
    std::vector<float> knownWeights(std::size_t frame) const;
    FileFrame fileFrame(const JointTracks& joints, std::size_t frame) const;
    std::vector<ClipShape> deltas(const JointTracks& joints);
    Added added(std::vector<ClipShape> deltas, const JointTracks& joints);
    Added fitted(const std::vector<ClipShape>& deltas, const JointTracks& joints);
    std::vector<float> allWeights(const std::vector<float>& added) const;
    std::vector<float> seconds() const;
    void write();
    void tellOfStuck(const BeforeSkin& before);

    std::filesystem::path path_;
    storage::WholeFile file_;
    MeshPolygons polygons_;
    ClipMotion motion_;
    std::vector<int> numbers_;
    std::vector<std::vector<float>> results_;             ///< [frames]
    std::vector<std::vector<HMatrix>> places_;            ///< [joints of the source][frames]
    std::vector<std::vector<std::vector<float>>> morphs_; ///< [morphs of the source][frames][targets]
    std::optional<ShapesOfMotion> shapes_;
    std::vector<std::string> notes_;
};

} // namespace quarn
