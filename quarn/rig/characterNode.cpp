// SPDX-License-Identifier: Apache-2.0
#include "rig/characterNode.h"

#include "rig/AttributeMaker.h"

namespace rig {

const HTypeId characterNode::id(0x6e770022);
const HString characterNode::typeName("character");

HObject characterNode::metersPerUnit;
HObject characterNode::framesPerSecond;
HObject characterNode::sourceFile;
HObject characterNode::vertexMapFile;

characterNode::characterNode() = default;
characterNode::~characterNode() = default;

HPxNode* characterNode::create() {
    return new (std::nothrow) characterNode;
}

HStatus characterNode::initialize() {
    AttributeMaker make;
    metersPerUnit = make.number("metersPerUnit", "mpu", 1.0);
    framesPerSecond = make.number("framesPerSecond", "fps", 24.0);
    sourceFile = make.data("sourceFile", "sf", HFnData::kString);
    vertexMapFile = make.data("vertexMapFile", "vmf", HFnData::kString);
    for (const HObject& file : {sourceFile, vertexMapFile})
        HFnTypedAttribute(file).setUsedAsFilename(true);
    make.add({metersPerUnit, framesPerSecond, sourceFile, vertexMapFile});
    return make.status();
}

void characterNode::getExternalContent(HExternalContentInfoTable& table) const {
    addExternalContentForFileAttr(table, sourceFile);
    addExternalContentForFileAttr(table, vertexMapFile);
    HPxNode::getExternalContent(table);
}

void characterNode::setExternalContent(const HExternalContentLocationTable& table) {
    setExternalContentForFileAttr(sourceFile, table);
    setExternalContentForFileAttr(vertexMapFile, table);
    HPxNode::setExternalContent(table);
}

} // namespace rig
