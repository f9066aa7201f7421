// SPDX-License-Identifier: Apache-2.0
#include "rig/registration.h"

#include "rig/animCurveNode.h"
#include "rig/animCurveQuaternionNode.h"
#include "rig/blendShapeNode.h"
#include "rig/characterNode.h"
#include "rig/jointNode.h"
#include "rig/pointCacheNode.h"
#include "rig/polyGridNode.h"
#include "rig/skinClusterNode.h"
#include "rig/slidersNode.h"

#include "openquarn/HFnPlugin.h"

#include <algorithm>
#include <vector>

namespace rig {
namespace {

struct NodeType {
    HString name;
    HTypeId id;
    HPxNode* (*create)();
    HStatus (*initialize)();
    HPxNode::Type kind;
};

const std::vector<NodeType>& nodeTypes() {
    static const std::vector<NodeType> types = {
        {jointNode::typeName, jointNode::id, jointNode::create, jointNode::initialize, HPxNode::kDependNode},
        {skinClusterNode::typeName, skinClusterNode::id, skinClusterNode::create, skinClusterNode::initialize,
         HPxNode::kDeformerNode},
        {animCurveNode::typeName, animCurveNode::id, animCurveNode::create, animCurveNode::initialize,
         HPxNode::kDependNode},
        {animCurveQuaternionNode::typeName, animCurveQuaternionNode::id, animCurveQuaternionNode::create,
         animCurveQuaternionNode::initialize, HPxNode::kDependNode},
        {pointCacheNode::typeName, pointCacheNode::id, pointCacheNode::create, pointCacheNode::initialize,
         HPxNode::kDependNode},
        {slidersNode::typeName, slidersNode::id, slidersNode::create, slidersNode::initialize, HPxNode::kDependNode},
        {blendShapeNode::typeName, blendShapeNode::id, blendShapeNode::create, blendShapeNode::initialize,
         HPxNode::kDeformerNode},
        {polyGridNode::typeName, polyGridNode::id, polyGridNode::create, polyGridNode::initialize,
         HPxNode::kDependNode},
        {characterNode::typeName, characterNode::id, characterNode::create, characterNode::initialize,
         HPxNode::kDependNode},
    };
    return types;
}

} // namespace

HStatus registerNodes(HObject object) {
    HFnPlugin plugin(object, "neuralWarp", "1.0", "Any");
    for (const NodeType& type : nodeTypes()) {
        HStatus status = plugin.registerNode(type.name, type.id, type.create, type.initialize, type.kind);
        status.perror(("registerNode " + type.name).asChar());
        if (status.error())
            return status;
    }
    return HStatus::kSuccess;
}

HStatus deregisterNodes(HObject object) {
    HFnPlugin plugin(object);
    std::vector<NodeType> types = nodeTypes();
    std::reverse(types.begin(), types.end());
    for (const NodeType& type : types) {
        HStatus status = plugin.deregisterNode(type.id);
        status.perror(("deregisterNode " + type.name).asChar());
        if (status.error())
            return status;
    }
    return HStatus::kSuccess;
}

} // namespace rig
