// SPDX-License-Identifier: Apache-2.0
// A rigged character as a file gives it, independent of the file's format and of the scene that is built from it.
//
// Everything is in the file's own units and axes, in double precision, for row vectors: p' = p * M, and A * B does A
// first. A skinned point p of a mesh stands at the sum over its influences of
//     weight * (p * inverseBind(joint) * world(joint)),
// where world(joint) is local(joint) * world(parent of joint). All indices are checked: they are in range.
#pragma once

#include "openquarn/HMatrix.h"
#include "openquarn/HPoint.h"
#include "openquarn/HQuaternion.h"
#include "openquarn/HVector.h"

#include <cstdint>
#include <string>
#include <vector>

namespace quarn {

/// A joint, or a node above one whose transformation the joint needs.
struct Joint {
    std::string name;      ///< not empty, unique among the joints
    int parent = -1;       ///< index into Character::joints, below that of the joint itself; -1 for a root
    HMatrix restTransform; ///< to the parent's space, as the file has it at rest; negative and uneven scale included
    int sourceNode = -1;   ///< index of the node in a glTF file; -1 in others
};

/// How much a joint moves a vertex.
struct Influence {
    std::uint32_t joint = 0; ///< index into Character::joints
    double weight = 0.0;     ///< finite and not 0
};

/// What a mesh was bound to a joint with.
struct Binding {
    std::uint32_t joint = 0; ///< index into Character::joints
    HMatrix inverseBind;     ///< from the mesh's space to that of the joint, at the time of binding
};

/// A shape that is added to the points of a mesh before the skin moves them: weight * delta.
struct MorphTarget {
    std::string name;                    ///< not empty, unique among the targets of the mesh
    double restWeight = 0.0;             ///< finite
    std::vector<std::uint32_t> vertices; ///< those that it moves: rising indices into the mesh's `points`
    std::vector<HVector> deltas;         ///< [vertices.size()], in the mesh's space; finite
};

/// What the vertices of a mesh are in its file.
enum class FileOrder : std::uint8_t {
    vertices,      ///< those that the file has: glTF splits them along seams
    controlPoints, ///< those of the modelling tool, in its order
    corners        ///< one for each corner of a polygon, in the importer's order: the control points are not known
};

/// "vertices", "control points" or "corners".
const char* nameOf(FileOrder order);

/// All that hangs on one node of the file: the parts that a format splits by material are one mesh.
struct CharacterMesh {
    std::string name;                        ///< not empty, unique among the meshes
    std::vector<HPoint> points;              ///< in the mesh's space, w = 1; all finite
    std::vector<std::uint32_t> polygonSizes; ///< corners of each polygon, 3 or more
    std::vector<std::uint32_t> corners;      ///< indices into `points`, polygon by polygon
    /// u and v of each texture coordinate, v up; finite. Empty: the mesh has none.
    std::vector<float> uvs;
    std::vector<std::uint32_t> cornerUvs; ///< for each of `corners`, which of them it has; empty where `uvs` is
    /// Those of each point: any number, by rising joint, no joint twice. [points.size()]; all empty in a mesh without
    /// skin.
    std::vector<std::vector<Influence>> influences;
    std::vector<Binding> bindings; ///< by rising joint; every joint of an influence has one. Empty: no skin
    std::vector<MorphTarget>
        morphTargets; ///< in the file's order; `points` are without them, whatever they weigh at rest
    /// For every vertex of the file, part by part, its index in `points`; see joinVertices().
    std::vector<std::uint32_t> joinedOf;
    FileOrder fileOrder = FileOrder::vertices; ///< what these vertices of the file are
    /// From the mesh's space to the world's, at rest. It places a mesh without skin; a skin does without it.
    HMatrix worldTransform;
    int parentJoint = -1; ///< the nearest joint at or above the mesh's node, or -1. A mesh without skin follows it
    int sourceNode = -1;  ///< index of the node that shows it in a glTF file; -1 in others
};

enum class Interpolation : std::uint8_t {
    Linear, ///< straight between keys; rotations turn at constant speed by the shorter way
    Step,   ///< the value of the last key
};

template <class Value>
struct Key {
    double seconds = 0.0; ///< finite, not below that of the key before
    Value value;          ///< finite
};

/// Before its first key and after its last a track keeps their values. Without a key it leaves the joint at rest.
template <class Value>
struct Track {
    Interpolation interpolation = Interpolation::Linear;
    std::vector<Key<Value>> keys;
};

/// A joint's local transformation over time: scale, then rotation, then translation.
struct JointChannel {
    std::uint32_t joint = 0; ///< index into Character::joints
    Track<HVector> translation;
    Track<HQuaternion> rotation; ///< unit quaternions
    Track<HVector> scale;
};

/// The weight of a morph target over time.
struct MorphChannel {
    std::uint32_t mesh = 0;   ///< index into Character::meshes
    std::uint32_t target = 0; ///< index into its morphTargets
    Track<double> weight;
};

struct Animation {
    std::string name;     ///< not empty, unique among the animations
    double seconds = 0.0; ///< the time of the last key, 0 or above
    std::vector<JointChannel> channels;
    std::vector<MorphChannel> morphs = {};
};

struct Character {
    std::vector<Joint> joints; ///< parents before their children
    std::vector<CharacterMesh> meshes;
    std::vector<Animation> animations;
    double metersPerUnit = 1.0;        ///< above 0
    std::vector<std::string> warnings; ///< what the user should know: sentences without a full stop
};

} // namespace quarn
