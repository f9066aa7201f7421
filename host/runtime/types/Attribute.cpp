// SPDX-License-Identifier: Apache-2.0
#include "types/Attribute.h"

#include "core/text.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <stdexcept>

namespace OpenQuarn {
namespace {

template <class Integer>
double roundedTo(double value) {
    if (std::isnan(value))
        return 0.0;
    // the sum makes a negative zero, which integers do not have, a zero
    return std::clamp(std::nearbyint(value) + 0.0, static_cast<double>(std::numeric_limits<Integer>::min()),
                      static_cast<double>(std::numeric_limits<Integer>::max()));
}

// a double beyond the range of a float becomes infinite: the conversion itself would be undefined
double roundedToFloat(double value) {
    constexpr double largest = std::numeric_limits<float>::max();
    constexpr double halfStep = 0x1p103; // half of the last place of the largest float
    if (std::isfinite(value) && std::fabs(value) >= largest + halfStep)
        return std::copysign(std::numeric_limits<double>::infinity(), value);
    if (std::isfinite(value) && std::fabs(value) > largest)
        return std::copysign(largest, value);
    return static_cast<double>(static_cast<float>(value));
}

} // namespace

bool Attribute::takesValueOf(const Attribute& source) const {
    if (kind_ == HFn::kMessageAttribute || source.kind_ == HFn::kMessageAttribute)
        return kind_ == HFn::kMessageAttribute; // a message plug only names its source, whatever that is
    if (isCompound() || source.isCompound())
        return isCompound() && source.isCompound() && children.size() == source.children.size() &&
               std::equal(children.begin(), children.end(), source.children.begin(),
                          [](const auto& a, const auto& b) { return a->array == b->array && a->takesValueOf(*b); });
    if (isNumber() || source.isNumber())
        return isNumber() && source.isNumber();
    return data == source.data && pluginData == source.pluginData;
}

double Attribute::stored(double value) const {
    switch (number) {
    case HFnNumericData::kBoolean:
        return value != 0.0 ? 1.0 : 0.0;
    case HFnNumericData::kShort:
        return roundedTo<short>(value);
    case HFnNumericData::kInt:
        return roundedTo<int>(value);
    case HFnNumericData::kFloat:
        return roundedToFloat(value);
    default:
        return value;
    }
}

// asked by setAttr and by the reader of scenes (decision 0112)
std::string Attribute::refusal(double value) const {
    if (!std::isfinite(value))
        return printedNumber(value) + " is not a finite number";
    if (std::isfinite(stored(value)) && (number == HFnNumericData::kFloat || stored(value) == value))
        return {};
    const std::string text = printedNumber(value);
    switch (number) {
    case HFnNumericData::kBoolean:
        return text + " is not a boolean (0 or 1)";
    case HFnNumericData::kShort:
        return text + " is not an integer from -32768 to 32767";
    case HFnNumericData::kInt:
        return text + " is not an integer from -2147483648 to 2147483647";
    default:
        return text + " is too large for single precision";
    }
}

double Attribute::limited(double value) const {
    if (min && value < *min)
        return *min;
    if (max && value > *max)
        return *max;
    return value;
}

bool Attribute::accepts(const Data* value) const {
    if (!holdsData())
        return false;
    if (!value)
        return true;
    if (value->dataType() != data)
        return false;
    if (data != HFnData::kPlugin)
        return true;
    const auto& plugin = static_cast<const PluginData&>(*value);
    return plugin.value && plugin.value->typeId() == pluginData;
}

const char* Attribute::typeName() const {
    switch (kind_) {
    case HFn::kEnumAttribute:
        return "enum";
    case HFn::kCompoundAttribute:
        return "compound";
    case HFn::kMessageAttribute:
        return "message";
    case HFn::kNumericAttribute:
        switch (number) {
        case HFnNumericData::kBoolean:
            return "bool";
        case HFnNumericData::kShort:
            return "short";
        case HFnNumericData::kInt:
            return "int";
        case HFnNumericData::kFloat:
            return "float";
        default:
            return "double";
        }
    default:
        break;
    }
    switch (data) {
    case HFnData::kString:
        return "string";
    case HFnData::kMatrix:
        return "matrix";
    case HFnData::kDoubleArray:
        return "doubleArray";
    case HFnData::kMesh:
        return "mesh";
    default:
        return "pluginData";
    }
}

std::shared_ptr<Attribute> makeAttribute(HFn::Type kind, const std::string& longName, const std::string& shortName) {
    for (const std::string& name : {longName, shortName})
        if (!isIdentifier(name))
            throw std::invalid_argument("'" + name + "' cannot name an attribute");
    return std::make_shared<Attribute>(kind, longName, shortName);
}

} // namespace OpenQuarn
