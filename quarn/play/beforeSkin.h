// SPDX-License-Identifier: Apache-2.0
// Where the points of a mesh have to be before a skin, for the skin to bring them where they should be after it.
#pragma once

#include "openquarn/HMatrix.h"
#include "quarn/play/MorphClip.h"
#include "quarn/scene/meshes.h"

#include <cstdint>
#include <map>
#include <span>
#include <vector>

namespace quarn {

/// A mesh of a file in a frame, as a reader has it without the clip's targets.
struct FileFrame {
    ClipShape before;             ///< the skin; normals empty or of any length
    std::vector<HMatrix> blended; ///< what the skin moves each vertex by
};

/// The vertices that a skin squeezes flat: nothing before it brings them anywhere else.
struct Stuck {
    std::size_t frames = 0;
    double farthest = 0.0; ///< from where they should be, in the scene's unit
};

/// What has to be added before the skin. A vertex whose matrix is singular gets nothing, and is told of.
class BeforeSkin {
public:
    /// `sceneVertexOf` by vertex of the file, below scene.vertexCount; both must live as long.
    BeforeSkin(const std::vector<std::int32_t>& sceneVertexOf, const MeshPolygons& scene);

    /// The differences for the points `xyz`, where the scene has them in that frame. Normals keep their angle to the
    /// surface: they turn as that of the surface does from what the skin alone makes of it; empty where the file's are.
    ClipShape deltas(const FileFrame& file, std::span<const float> xyz);

    /// By vertex of the file, over all frames.
    const std::map<std::size_t, Stuck>& stuck() const { return stuck_; }
    /// Whether a matrix has no inverse to speak of: it leaves less than a millionth of a volume.
    static bool isSingular(const HMatrix& matrix);

private:
    std::vector<float> skinned(const FileFrame& file) const;

    const std::vector<std::int32_t>& sceneVertexOf_;
    const MeshPolygons& scene_;
    std::map<std::size_t, Stuck> stuck_;
};

} // namespace quarn
