// SPDX-License-Identifier: Apache-2.0
// What makes the mesh that comes into the deformer, as far as a page can compute it: blend shapes, then a skin.
#pragma once

#include "openquarn/HPlug.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/joints.h"
#include "quarn/scene/skins.h"
#include "rig/ShapeDeltas.h"
#include "rig/SkinWeights.h"

#include <cstdint>
#include <string>
#include <vector>

namespace quarn {

struct InputChain {
    /// A blend shape, by rising index.
    struct Shape {
        unsigned index = 0;                 ///< among the node's weights
        HPlug weight;                       ///< of the node; null where it is combined
        rig::ShapeDeltas deltas;            ///< none where only others are combined of its weight
        std::vector<std::uint32_t> factors; ///< of a combined one: positions in `shapes`
        std::vector<double> ramps;          ///< [3 * factors], or none
    };
    /// A matrix of the skin.
    struct Influence {
        HPlug matrix, bind;
        std::size_t joint = none; ///< index among the scene's joints; none: another matrix
        static constexpr std::size_t none = static_cast<std::size_t>(-1);
    };
    HPlug base;                        ///< the mesh that comes into shapes and skin
    std::vector<Shape> shapes;         ///< in the order in which they are added
    rig::SkinWeights skin;             ///< of no vertices without a skin
    std::vector<Influence> influences; ///< [skin.joints.size()]
};

/// Of a geometry of the deformer, once its input has been evaluated. Throws NotInPage, naming the plug, where something
/// stands there that is neither, or that does less than all of what it could; std::runtime_error for damaged lists.
/// Thread: main.
InputChain inputChain(const WarpGeometry& geometry, const std::vector<SceneJoint>& joints);

/// Why a deformer of `geometry` moves less than its whole mesh all the way; a sentence, or empty. Thread: main.
std::string whyNotWhole(const HObject& deformer, unsigned geometry);

/// The weight of each of `vertices` vertices in a deformer's weightList; empty where all are 1. Thread: main.
std::vector<float> pointWeights(const HObject& deformer, unsigned geometry, std::size_t vertices);

/// The weights of the shapes now, combined ones included. Throws std::runtime_error, naming the plug. Thread: main.
std::vector<double> shapeWeights(const std::vector<InputChain::Shape>& shapes);

} // namespace quarn
