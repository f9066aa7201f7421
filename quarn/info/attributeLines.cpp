// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HFnData.h"
#include "openquarn/HMatrix.h"
#include "openquarn_app/Commands.h"
#include "quarn/info/attributeTexts.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <iterator>

namespace quarn {
namespace {

using OpenQuarn::AttributeInfo;

bool isNumber(const AttributeInfo& attribute) {
    return attribute.kind == HFn::kNumericAttribute || attribute.kind == HFn::kEnumAttribute;
}

std::string typeText(const AttributeInfo& attribute) {
    std::string text = attribute.valueType;
    if (attribute.pluginDataType.id() != 0) {
        std::array<char, 16> id{};
        std::snprintf(id.data(), id.size(), " 0x%08x", static_cast<unsigned>(attribute.pluginDataType.id()));
        text += id.data();
    }
    std::string labels;
    for (const auto& [value, label] : attribute.fields)
        labels += (labels.empty() ? " {" : ", ") + std::to_string(value) + " " + label;
    return (attribute.array ? "array of " : "") + text + (labels.empty() ? "" : labels + "}");
}

std::string defaultText(const AttributeInfo& attribute) {
    if (attribute.valueType == "bool")
        return attribute.defaultNumber != 0.0 ? " = true" : " = false";
    if (isNumber(attribute))
        return " = " + numberText(attribute.defaultNumber, attribute.valueType == "float");
    if (attribute.defaultData.hasFn(HFn::kStringData))
        return " = \"" + HFnStringData(attribute.defaultData).string().asStdString() + "\"";
    if (attribute.defaultData.hasFn(HFn::kMatrixData) || attribute.defaultData.hasFn(HFn::kDoubleArrayData))
        return " = [" + OpenQuarn::printedValue(numbersIn(attribute.defaultData)) + "]";
    return "";
}

std::string limitTexts(const AttributeInfo& attribute) {
    std::string text;
    const auto add = [&](const char* name, const std::optional<double>& limit) {
        if (limit)
            text += std::string(", ") + name + " " + numberText(*limit, false);
    };
    add("min", attribute.min);
    add("max", attribute.max);
    add("soft min", attribute.softMin);
    add("soft max", attribute.softMax);
    return text;
}

std::string flagTexts(const AttributeInfo& attribute) {
    constexpr std::array disconnect = {"", ", reset when disconnected", ", deleted when disconnected"};
    std::string text;
    const auto add = [&](bool isSaid, const char* flag) { text += isSaid ? std::string(", ") + flag : ""; };
    add(!attribute.readable, "not readable");
    add(!attribute.writable, "not writable");
    add(!attribute.connectable, "not connectable");
    add(!attribute.storable, "not storable");
    add(isNumber(attribute) && !attribute.keyable, "not keyable");
    add(!isNumber(attribute) && attribute.keyable, "keyable");
    add(attribute.hidden, "hidden");
    add(!attribute.indexMatters, "index does not matter");
    add(attribute.usesArrayDataBuilder, "array data builder");
    add(attribute.usedAsFilename, "file name");
    add(attribute.inherited, "inherited");
    return text + disconnect.at(static_cast<std::size_t>(attribute.disconnectBehavior));
}

std::string affectsText(const std::string& name, const std::vector<OpenQuarn::AffectsInfo>& dependencies) {
    std::vector<std::string> affected; // said once, however often it was declared
    for (const OpenQuarn::AffectsInfo& dependency : dependencies) {
        const std::string text = dependency.affected + (dependency.tree ? " (with what is below)" : "");
        if (dependency.affecting == name && std::find(affected.begin(), affected.end(), text) == affected.end())
            affected.push_back(text);
    }
    std::string all;
    for (const std::string& text : affected)
        all += (all.empty() ? "; affects " : ", ") + text;
    return all;
}

} // namespace

std::string numberText(double value, bool isFloat) {
    const double size = std::fabs(value);
    const bool isPlain = size == 0.0 || (size >= 1e-6 && size < 1e15);
    const std::chars_format format = isPlain ? std::chars_format::fixed : std::chars_format::general;
    std::array<char, 64> digits{};
    char* const end = digits.data() + digits.size();
    const auto result = isFloat ? std::to_chars(digits.data(), end, static_cast<float>(value), format)
                                : std::to_chars(digits.data(), end, value, format);
    return {digits.data(), result.ptr};
}

std::vector<double> numbersIn(const HObject& data) {
    if (!data.hasFn(HFn::kMatrixData))
        return HFnDoubleArrayData(data).values();
    const HMatrix matrix = HFnMatrixData(data).matrix();
    std::vector<double> values;
    values.reserve(16);
    for (const auto& row : matrix.matrix)
        values.insert(values.end(), std::begin(row), std::end(row));
    return values;
}

std::string attributeLines(const AttributeList& list) {
    std::string all;
    std::vector<std::string> above; // the compounds that the attribute is in
    for (const AttributeInfo& attribute : list.attributes) {
        while (!above.empty() && above.back() != attribute.parent)
            above.pop_back();
        all += std::string(2 * above.size(), ' ') + attribute.name + " (" + attribute.shortName + "): ";
        all += typeText(attribute) + defaultText(attribute) + limitTexts(attribute) + flagTexts(attribute);
        all += affectsText(attribute.name, list.dependencies) + "\n";
        above.push_back(attribute.name);
    }
    return all;
}

} // namespace quarn
