// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HGPUDeformerRegistrationInfo.h"

#include "graph/Node.h"
#include "types/Attribute.h"

namespace {

HObject attributeOf(const HObject& node, const char* name) {
    const auto object = OpenQuarn::Access::as<OpenQuarn::Node>(node);
    const OpenQuarn::Field* field = object ? object->type().find(name) : nullptr;
    return field ? OpenQuarn::Access::object(std::const_pointer_cast<OpenQuarn::Attribute>(field->attribute))
                 : HObject::kNullObj;
}

} // namespace

HGPUDeformerRegistrationInfo::HGPUDeformerRegistrationInfo() = default;
HGPUDeformerRegistrationInfo::~HGPUDeformerRegistrationInfo() = default;

bool HGPUDeformerRegistrationInfo::validateNodeInGraph(HDataBlock&, const HObject&, const HPlug&, HStringArray*) {
    return true;
}
bool HGPUDeformerRegistrationInfo::validateNodeValues(HDataBlock&, const HObject&, const HPlug&, HStringArray*) {
    return true;
}
HObject HGPUDeformerRegistrationInfo::outputMeshAttribute(const HObject& node) const {
    return attributeOf(node, "outputGeom");
}
HObject HGPUDeformerRegistrationInfo::inputMeshAttribute(const HObject& node) const {
    return attributeOf(node, "inputGeometry");
}
void HGPUDeformerRegistrationInfo::additionalInputMeshAttributes(const HObject&, HObjectArray&) const {}
bool HGPUDeformerRegistrationInfo::matchAncestorLogicalIndices() const {
    return true;
}
HObject HGPUDeformerRegistrationInfo::passThroughInputMeshAttribute(const HObject& node) const {
    return inputMeshAttribute(node);
}
bool HGPUDeformerRegistrationInfo::isGeometryFilter() const {
    return true;
}
