// SPDX-License-Identifier: Apache-2.0
// The importer hands out the corners of FBX and Collada meshes. Which of them are one vertex of the tool that has made
// the file is found by comparing polygons with those that the file itself has (decision 0176).
#pragma once

#include "quarn/character/ControlMesh.h"

#include <assimp/mesh.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace quarn {

/// A part of a mesh as the importer has it, and where its vertices begin among those of the mesh. Indices in range.
struct ImportedPart {
    const aiMesh* mesh = nullptr;
    std::uint32_t firstVertex = 0;
};

/// Of each control point its vertex after joining. `vertexOf` is empty when `problem` says why there is no such map.
struct ControlPointMap {
    std::vector<std::uint32_t> vertexOf;
    std::string problem; ///< the rest of a sentence that begins with the mesh
};

/// The control meshes of a file, and which of them the importer's meshes are. Thread: any, one at a time.
class ControlPoints {
public:
    ControlPoints() = default;
    /// Of a file with the ending ".fbx" or ".dae"; a file that cannot be read has a problem with every mesh.
    ControlPoints(std::string_view bytes, const std::string& ending);

    /// False for a file whose own vertices the importer hands out.
    bool areCounted() const { return areCounted_; }
    /// Finds the control mesh with the polygons of these parts: those of each part stand there in their order, with
    /// corners in the same places, up to the rounding of single precision. `joinedOf`: see joinVertices().
    ControlPointMap mapOf(const std::vector<ImportedPart>& parts, const std::vector<std::uint32_t>& joinedOf);

private:
    std::vector<ControlMesh> meshes_;
    std::vector<bool> isTaken_;
    std::string problem_;
    bool areCounted_ = false;
};

} // namespace quarn
