// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HFnData.h"
#include "quarn/console/json.h"
#include "quarn/info/attributeTexts.h"

#include <array>
#include <cmath>
#include <optional>

namespace quarn {
namespace {

using OpenQuarn::AffectsInfo;
using OpenQuarn::AttributeInfo;

// JSON has no infinity: it stands as a text, as in scene files
void writeNumber(JsonWriter& writer, double value, bool isFloat = false) {
    const std::string text = numberText(value, isFloat);
    if (std::isfinite(value))
        writer.RawValue(text.data(), text.size(), rapidjson::kNumberType);
    else
        writeText(writer, text);
}

void writeData(JsonWriter& writer, const HObject& data) {
    if (data.isNull()) {
        writer.Null();
    } else if (data.hasFn(HFn::kStringData)) {
        writeText(writer, HFnStringData(data).string().asStdString());
    } else if (data.hasFn(HFn::kMatrixData) || data.hasFn(HFn::kDoubleArrayData)) {
        writer.StartArray();
        for (const double number : numbersIn(data))
            writeNumber(writer, number);
        writer.EndArray();
    } else {
        writer.StartObject();
        writer.EndObject();
    }
}

void writeDefault(JsonWriter& writer, const AttributeInfo& attribute) {
    writer.Key("default");
    if (attribute.valueType == "bool")
        writer.Bool(attribute.defaultNumber != 0.0);
    else if (attribute.kind == HFn::kNumericAttribute || attribute.kind == HFn::kEnumAttribute)
        writeNumber(writer, attribute.defaultNumber, attribute.valueType == "float");
    else
        writeData(writer, attribute.defaultData);
}

void writeLimit(JsonWriter& writer, const char* key, const std::optional<double>& limit) {
    writer.Key(key);
    if (limit)
        writeNumber(writer, *limit);
    else
        writer.Null();
}

const char* kindName(HFn::Type kind) {
    switch (kind) {
    case HFn::kNumericAttribute:
        return "numeric";
    case HFn::kEnumAttribute:
        return "enum";
    case HFn::kMatrixAttribute:
        return "matrix";
    case HFn::kCompoundAttribute:
        return "compound";
    case HFn::kMessageAttribute:
        return "message";
    default:
        return "typed";
    }
}

void writeValue(JsonWriter& writer, const AttributeInfo& attribute) {
    writeText(writer, "kind", kindName(attribute.kind));
    writeText(writer, "type", attribute.valueType);
    writer.Key("dataTypeId");
    if (attribute.pluginDataType.id() != 0)
        writer.Uint(attribute.pluginDataType.id());
    else
        writer.Null();
    writer.Key("fields");
    if (attribute.kind == HFn::kEnumAttribute) {
        writer.StartArray();
        for (const auto& [value, label] : attribute.fields) {
            writer.StartObject();
            writer.Key("value");
            writer.Int(value);
            writeText(writer, "label", label);
            writer.EndObject();
        }
        writer.EndArray();
    } else {
        writer.Null();
    }
    writeDefault(writer, attribute);
    writeLimit(writer, "min", attribute.min);
    writeLimit(writer, "max", attribute.max);
    writeLimit(writer, "softMin", attribute.softMin);
    writeLimit(writer, "softMax", attribute.softMax);
}

void writeFlags(JsonWriter& writer, const AttributeInfo& attribute) {
    constexpr std::array disconnect = {"nothing", "reset", "delete"};
    writeBool(writer, "array", attribute.array);
    writeBool(writer, "readable", attribute.readable);
    writeBool(writer, "writable", attribute.writable);
    writeBool(writer, "connectable", attribute.connectable);
    writeBool(writer, "storable", attribute.storable);
    writeBool(writer, "keyable", attribute.keyable);
    writeBool(writer, "hidden", attribute.hidden);
    writeBool(writer, "indexMatters", attribute.indexMatters);
    writeBool(writer, "usesArrayDataBuilder", attribute.usesArrayDataBuilder);
    writeBool(writer, "usedAsFilename", attribute.usedAsFilename);
    writeText(writer, "disconnect", disconnect.at(static_cast<std::size_t>(attribute.disconnectBehavior)));
}

void writeAffects(JsonWriter& writer, const std::string& name, const std::vector<AffectsInfo>& dependencies) {
    writer.Key("affects");
    writer.StartArray();
    for (const AffectsInfo& dependency : dependencies) {
        if (dependency.affecting != name)
            continue;
        writer.StartObject();
        writeText(writer, "attribute", dependency.affected);
        writeBool(writer, "tree", dependency.tree);
        writeBool(writer, "sameElement", dependency.sameElement);
        writeBool(writer, "inherited", dependency.inherited);
        writer.EndObject();
    }
    writer.EndArray();
}

} // namespace

std::string attributeJson(const AttributeList& list) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartArray();
    for (const AttributeInfo& attribute : list.attributes) {
        writer.StartObject();
        writeText(writer, "name", attribute.name);
        writeText(writer, "shortName", attribute.shortName);
        writer.Key("parent");
        if (attribute.parent.empty())
            writer.Null();
        else
            writeText(writer, attribute.parent);
        writeBool(writer, "inherited", attribute.inherited);
        writeValue(writer, attribute);
        writeFlags(writer, attribute);
        writeAffects(writer, attribute.name, list.dependencies);
        writer.EndObject();
    }
    writer.EndArray();
    return buffer.GetString();
}

} // namespace quarn
