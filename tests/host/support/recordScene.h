// SPDX-License-Identifier: Apache-2.0
// The scene that tests of whole evaluations share: large enough for threads to matter, and nowhere regular.
#pragma once

#include "openquarn/HPlug.h"

#include <string>
#include <vector>

namespace recordScene {

/// Three geometries, with the logical indices 0, 1 and 4, go through two deformers, one after the other:
///   index   vertices   what is affected
///     0       1 024    all of it
///     1      20 022    the component tag "patch" in both deformers: two fifths of the vertices, shuffled
///     4     100 172    all of it; every third vertex has a weight in the first deformer, every fifth in the second
/// Each is a height field of triangles, quads, hexagons and octagons with holes, and with vertices that belong to no
/// polygon. The meshes are held by mesh nodes, which are the rest geometries of both deformers, too.
struct Scene {
    std::vector<HObject> meshes;      ///< mesh nodes
    HObject first, second;            ///< deformers
    std::vector<unsigned> geometries; ///< their logical indices
    HPlugArray outputs;               ///< of the second
};

/// Builds it from nodes of two registered deformer types. Throws std::runtime_error, with the host's sentence, when
/// something of it cannot be made.
Scene build(const std::string& firstType, const std::string& secondType);

/// One of its meshes, about `columns` * `rows` vertices in size.
HObject mesh(unsigned columns, unsigned rows, unsigned seed);

} // namespace recordScene
