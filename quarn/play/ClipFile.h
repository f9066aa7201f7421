// SPDX-License-Identifier: Apache-2.0
// A moving mesh as one binary glTF 2.0 file: a mesh with morph targets, and an animation of their weights.
#pragma once

#include "quarn/play/AnimatedFile.h"
#include "quarn/play/MorphClip.h"
#include "quarn/scene/GltfVertices.h"
#include "storage/WholeFile.h"

#include <vector>

namespace quarn {

/// Frames are kept until finish(): 24 bytes a vertex and frame. Between two frames every point goes on a straight line.
/// Frame 1 is at 0 seconds, or the first one where that is before it. The node has the scale that makes metres of the
/// mesh's unit; polygons are triangles, and vertices are split where texture coordinates have a seam.
class ClipFile : public AnimatedFile {
public:
    ClipFile(const std::filesystem::path& path, MeshPolygons polygons, ClipMotion motion);

    std::uint64_t expectedBytes() const override;
    void add(int frame, std::span<const float> xyz) override;
    void finish() override;
    std::optional<ShapesOfMotion> shapes() const override { return shapes_; }

private:
    MorphClip clip();
    MorphClip clipOfMesh();
    void split(ClipShape& shape) const;

    std::filesystem::path path_;
    storage::WholeFile file_;
    MeshPolygons polygons_;
    GltfVertices vertices_;
    ClipMotion motion_;
    std::vector<int> numbers_;
    std::vector<ClipShape> frames_;
    std::optional<ShapesOfMotion> shapes_;
};

/// The file's content. `clip` has vertices.count() vertices, `seconds` of each frame rise from 0 or more; there are
/// triangles. The stream must be in the classic locale. Throws std::runtime_error where all of it is more than 4 GB.
void writeClip(std::ostream& out, const MorphClip& clip, const GltfVertices& vertices,
               const std::vector<float>& seconds, const ClipMotion& motion);

} // namespace quarn
