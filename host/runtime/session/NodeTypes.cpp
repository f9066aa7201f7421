// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/NodeTypes.h"

#include "core/threads.h"
#include "types/NodeClass.h"

#include <stdexcept>

namespace OpenQuarn {
namespace {

std::shared_ptr<const NodeClass> typeNamed(const std::string& name) {
    std::shared_ptr<const NodeClass> type = findNodeClass(name);
    if (!type)
        throw std::runtime_error("there is no node type '" + name + "'");
    return type;
}

void describeValue(const Attribute& attribute, AttributeInfo& info) {
    info.kind = attribute.kind();
    info.valueType = attribute.typeName();
    info.pluginDataType = attribute.pluginData;
    info.fields.reserve(attribute.fields.size());
    for (const auto& [label, value] : attribute.fields)
        info.fields.emplace_back(value, label);
    info.defaultNumber = attribute.defaultNumber;
    info.defaultData = Access::object(attribute.defaultData);
    info.min = attribute.min;
    info.max = attribute.max;
    info.softMin = attribute.softMin;
    info.softMax = attribute.softMax;
}

void describeFlags(const Attribute& attribute, AttributeInfo& info) {
    info.array = attribute.array;
    info.readable = attribute.readable;
    info.writable = attribute.writable;
    info.connectable = attribute.connectable;
    info.storable = attribute.storable;
    info.keyable = attribute.keyable;
    info.hidden = attribute.hidden;
    info.indexMatters = attribute.indexMatters;
    info.usesArrayDataBuilder = attribute.builder;
    info.usedAsFilename = attribute.filename;
    info.disconnectBehavior = attribute.onDisconnect;
}

void appendTree(const NodeClass& type, const Field& field, std::vector<AttributeInfo>& all) {
    AttributeInfo info;
    info.name = field.attribute->name;
    info.shortName = field.attribute->shortName;
    info.parent = field.parent ? field.parent->attribute->name : std::string();
    info.inherited = type.isInherited(field);
    describeValue(*field.attribute, info);
    describeFlags(*field.attribute, info);
    all.push_back(std::move(info));
    for (const std::unique_ptr<Field>& child : field.children)
        appendTree(type, *child, all);
}

} // namespace

std::vector<std::string> nodeTypes() {
    requireThread({"nodeTypes", ThreadTag::main});
    std::vector<std::string> names;
    const std::vector<std::shared_ptr<const NodeClass>> types = nodeClasses();
    names.reserve(types.size());
    for (const std::shared_ptr<const NodeClass>& type : types)
        names.push_back(type->name);
    return names;
}

std::vector<AttributeInfo> attributesOf(const std::string& nodeType) {
    requireThread({"attributesOf", ThreadTag::main});
    const std::shared_ptr<const NodeClass> type = typeNamed(nodeType);
    std::vector<AttributeInfo> all;
    for (const std::unique_ptr<Field>& field : type->fields())
        appendTree(*type, *field, all);
    return all;
}

std::vector<AffectsInfo> dependenciesOf(const std::string& nodeType) {
    requireThread({"dependenciesOf", ThreadTag::main});
    const std::shared_ptr<const NodeClass> type = typeNamed(nodeType);
    std::vector<AffectsInfo> all;
    all.reserve(type->declarations().size());
    for (const NodeClass::Declaration& made : type->declarations())
        all.push_back({made.affecting->attribute->name, made.affected->attribute->name, made.tree, made.sameElement,
                       made.inherited});
    return all;
}

} // namespace OpenQuarn
