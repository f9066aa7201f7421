// SPDX-License-Identifier: Apache-2.0
#include "rig/jointNode.h"

#include "openquarn_helpers/AttributeMaker.h"
#include "openquarn_helpers/guard.h"

#include "rig/Inputs.h"
#include "rig/jointMatrix.h"

namespace rig {

using openquarn_helpers::AttributeMaker;
using openquarn_helpers::guarded;
using openquarn_helpers::outputFlags;

using Node = jointNode;

const HTypeId Node::id(0x6e770010);
const HString Node::typeName("joint");

HObject Node::translateX, Node::translateY, Node::translateZ, Node::translate;
HObject Node::rotateX, Node::rotateY, Node::rotateZ, Node::rotate;
HObject Node::rotateOrder;
HObject Node::jointOrientX, Node::jointOrientY, Node::jointOrientZ, Node::jointOrient;
HObject Node::scaleX, Node::scaleY, Node::scaleZ, Node::scale;
HObject Node::parentMatrix;
HObject Node::restMatrix;
HObject Node::matrix;
HObject Node::worldMatrix;
HObject Node::relativeMatrix;

jointNode::jointNode() = default;
jointNode::~jointNode() = default;

HPxNode* jointNode::create() {
    return new (std::nothrow) jointNode;
}

HStatus jointNode::initialize() {
    AttributeMaker make;
    translateX = make.real("translateX", "tx");
    translateY = make.real("translateY", "ty");
    translateZ = make.real("translateZ", "tz");
    translate = make.compound("translate", "t", {translateX, translateY, translateZ});
    rotateX = make.real("rotateX", "rx");
    rotateY = make.real("rotateY", "ry");
    rotateZ = make.real("rotateZ", "rz");
    rotate = make.compound("rotate", "r", {rotateX, rotateY, rotateZ});
    rotateOrder = make.rotationOrder("rotateOrder", "ro");
    jointOrientX = make.real("jointOrientX", "jox");
    jointOrientY = make.real("jointOrientY", "joy");
    jointOrientZ = make.real("jointOrientZ", "joz");
    jointOrient = make.compound("jointOrient", "jo", {jointOrientX, jointOrientY, jointOrientZ});
    scaleX = make.real("scaleX", "sx", 1.0);
    scaleY = make.real("scaleY", "sy", 1.0);
    scaleZ = make.real("scaleZ", "sz", 1.0);
    scale = make.compound("scale", "s", {scaleX, scaleY, scaleZ});
    parentMatrix = make.matrix("parentMatrix", "pm");
    restMatrix = make.matrix("restMatrix", "rsm");
    matrix = make.matrix("matrix", "m", outputFlags);
    worldMatrix = make.matrix("worldMatrix", "wm", outputFlags);
    relativeMatrix = make.matrix("relativeMatrix", "rm", outputFlags);
    make.add({translate, rotate, rotateOrder, jointOrient, scale, parentMatrix, restMatrix, matrix, worldMatrix,
              relativeMatrix});
    make.affects({translate, rotate, rotateOrder, jointOrient, scale}, {matrix, worldMatrix, relativeMatrix}, true);
    make.affects({parentMatrix}, {worldMatrix}, true);
    make.affects({restMatrix}, {relativeMatrix}, true);
    return make.status();
}

namespace {

HMatrix localMatrix(Inputs& inputs) {
    JointChannels channels;
    channels.rotate = inputs.vector(Node::rotateX, Node::rotateY, Node::rotateZ);
    channels.jointOrient = inputs.vector(Node::jointOrientX, Node::jointOrientY, Node::jointOrientZ);
    channels.scale = inputs.vector(Node::scaleX, Node::scaleY, Node::scaleZ);
    channels.order = inputs.rotationOrder(Node::rotateOrder);
    channels.translate = inputs.vector(Node::translateX, Node::translateY, Node::translateZ);
    return jointMatrix(channels);
}

HStatus toRelative(HMatrix& local, const HMatrix& rest) {
    HStatus status;
    const HMatrix inverse = rest.inverse(&status);
    if (status.error())
        return {HStatus::kFailure, "restMatrix is singular, so that there is no pose relative to it"};
    local = local * inverse;
    return HStatus::kSuccess;
}

} // namespace

HStatus jointNode::compute(const HPlug& plug, HDataBlock& block) {
    return guarded([&]() -> HStatus {
        const HObject output = plug.attribute();
        if (output != matrix && output != worldMatrix && output != relativeMatrix)
            return HStatus::kUnknownParameter;
        Inputs inputs(block);
        HMatrix result = localMatrix(inputs);
        if (output == worldMatrix)
            result *= inputs.matrix(parentMatrix);
        HStatus status = output == relativeMatrix ? toRelative(result, inputs.matrix(restMatrix)) : HStatus();
        if (inputs.status().error())
            return inputs.status();
        if (status.error())
            return status;
        status = block.outputValue(output).set(result);
        return status.error() ? status : block.setClean(plug);
    });
}

} // namespace rig
