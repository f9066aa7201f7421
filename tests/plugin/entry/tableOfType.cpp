// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HFnData.h"
#include "openquarn_app/NodeTypes.h"
#include "plugin/entry/AttributeTable.h"
#include "plugin/entry/tableTexts.h"

#include <array>
#include <optional>

namespace attributeTable {
namespace {

using OpenQuarn::AttributeInfo;

std::string typeText(const AttributeInfo& info) {
    if (info.valueType == "pluginData") {
        std::array<char, 16> id{};
        std::snprintf(id.data(), id.size(), "data 0x%08x", static_cast<unsigned>(info.pluginDataType.id()));
        return id.data();
    }
    std::string text = info.valueType;
    for (const auto& [value, label] : info.fields)
        text += (text == "enum" ? " " : ", ") + std::to_string(value) + " " + label;
    return text;
}

std::string defaultText(const AttributeInfo& info) {
    if (info.valueType == "bool")
        return info.defaultNumber == 1.0 ? "true" : "false";
    if (info.kind == HFn::kNumericAttribute || info.kind == HFn::kEnumAttribute)
        return numberText(info.defaultNumber, info.valueType == "float");
    if (info.kind == HFn::kCompoundAttribute || info.kind == HFn::kMessageAttribute)
        return "";
    if (info.defaultData.isNull())
        return "null";
    const bool isText = info.defaultData.hasFn(HFn::kStringData);
    return isText ? "\"" + HFnStringData(info.defaultData).string().asStdString() + "\"" : "data";
}

std::string limitText(const AttributeInfo& info) {
    std::map<std::string, std::string> limits;
    const auto add = [&](const char* name, const std::optional<double>& limit) {
        if (limit)
            limits[name] = numberText(*limit, false);
    };
    add("min", info.min);
    add("max", info.max);
    add("softMin", info.softMin);
    add("softMax", info.softMax);
    return limitsText(limits);
}

Fields fieldsOf(const AttributeInfo& info) {
    constexpr std::array disconnect = {"nothing", "reset", "delete"};
    const auto text = [](bool flag) { return flag ? "on" : "off"; };
    return {{"short name", info.shortName},
            {"type", typeText(info)},
            {"default", defaultText(info)},
            {"limits", limitText(info)},
            {"parent", info.parent},
            {"array", text(info.array)},
            {"readable", text(info.readable)},
            {"writable", text(info.writable)},
            {"connectable", text(info.connectable)},
            {"storable", text(info.storable)},
            {"keyable", text(info.keyable)},
            {"hidden", text(info.hidden)},
            {"indexMatters", text(info.indexMatters)},
            {"builder", text(info.usesArrayDataBuilder)},
            {"filename", text(info.usedAsFilename)},
            {"disconnect", disconnect.at(static_cast<std::size_t>(info.disconnectBehavior))}};
}

} // namespace

Table tableOfType(const std::string& nodeType) {
    Table table;
    for (const AttributeInfo& info : OpenQuarn::attributesOf(nodeType))
        if (!info.inherited) {
            table.attributes[info.name] = fieldsOf(info);
            table.order[info.parent].push_back(info.name);
        }
    for (const OpenQuarn::AffectsInfo& info : OpenQuarn::dependenciesOf(nodeType))
        if (!info.inherited)
            table.dependencies.push_back(info.affecting + " -> " + info.affected + (info.tree ? " tree" : ""));
    return table;
}

} // namespace attributeTable
