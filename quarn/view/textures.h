// SPDX-License-Identifier: Apache-2.0
// The pictures that a character has on its surface, as its file names them, small enough for a page.
#pragma once

#include "openquarn/HObject.h"
#include "quarn/scene/meshes.h"
#include "quarn/view/pagePicture.h"

#include <array>
#include <cstdint>
#include <string>
#include <vector>

namespace quarn {

/// What some of the page's triangles look like. These are the polygons' in their order, as many as a polygon has
/// corners beyond two.
struct PageMaterial {
    std::uint32_t firstTriangle = 0, triangles = 0;
    std::int32_t texture = -1;            ///< index into PageTextures::textures; -1: none
    std::array<float, 3> colour{1, 1, 1}; ///< linear; multiplies that of the texture
    bool isCutOut = false;                ///< where the texture's alpha is below a half there is a hole
};

struct PageTextures {
    std::vector<PageTexture> textures;
    std::vector<PageMaterial> materials; ///< of all triangles, one after another; empty without a texture
    std::vector<std::string> notes;      ///< what is not carried over, and why: sentences without a full stop
};

/// The base colours of a mesh that was imported from glTF. `mesh` is its node in the scene, by whose name its vertex
/// map is found, and `polygons` are those of the node; pictures are at most `textureSize` pixels along either side,
/// which is above 0. Neither the character's file nor the pictures beside it are trusted: they are read in a process of
/// its own. What cannot be carried over becomes a note. Throws Interrupted and std::bad_alloc alone. Thread: main.
PageTextures gatherTextures(const HObject& mesh, const MeshPolygons& polygons, std::uint32_t textureSize);

} // namespace quarn
