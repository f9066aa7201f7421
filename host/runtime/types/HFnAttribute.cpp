// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HFnAttribute.h"

#include "core/apiCall.h"
#include "core/text.h"
#include "types/Attribute.h"

#include <algorithm>
#include <cmath>
#include <utility>

using OpenQuarn::Access;
using OpenQuarn::apiCall;
using OpenQuarn::apiValue;
using OpenQuarn::Attribute;
using OpenQuarn::Operation;

namespace {

std::shared_ptr<Attribute> attached(const HObject& object) {
    return Access::as<Attribute>(object);
}

HStatus nothingAttached() {
    return {HStatus::kInvalidParameter, "no attribute is attached to the function set"};
}

/// Runs `change` on the attached attribute while it may still be changed.
template <class Change>
HStatus changeAttribute(const HObject& object, Operation point, Change&& change) {
    return apiCall(point, [&]() -> HStatus {
        const std::shared_ptr<Attribute> attribute = attached(object);
        if (!attribute)
            return nothingAttached();
        if (attribute->fixed)
            return {HStatus::kFailure, "attribute '" + attribute->name + "' belongs to a node type and is fixed"};
        return change(*attribute);
    });
}

HStatus setFlag(const HObject& object, Operation point, bool Attribute::*flag, bool on) {
    return changeAttribute(object, point, [&](Attribute& attribute) -> HStatus {
        attribute.*flag = on;
        return HStatus::kSuccess;
    });
}

HStatus refused(const Attribute& attribute, const std::string& why) {
    return {HStatus::kInvalidParameter, "attribute '" + attribute.name + "': " + why};
}

std::string notANumber(const char* what) {
    return std::string(what) + " is not a number (NaN)";
}

bool flagOf(const HObject& object, bool Attribute::*flag) {
    const std::shared_ptr<Attribute> attribute = attached(object);
    return attribute && (*attribute).*flag;
}

} // namespace

HFnAttribute::HFnAttribute(const HObject& object, HStatus* status) {
    const HStatus outcome = setObject(object);
    if (status)
        *status = outcome;
}

HString HFnAttribute::name() const {
    const std::shared_ptr<Attribute> attribute = attached(object_);
    return attribute ? HString(attribute->name) : HString();
}

HString HFnAttribute::shortName() const {
    const std::shared_ptr<Attribute> attribute = attached(object_);
    return attribute ? HString(attribute->shortName) : HString();
}

HObject HFnAttribute::parent() const {
    const std::shared_ptr<Attribute> attribute = attached(object_);
    return attribute ? Access::object(attribute->parent.lock()) : HObject();
}

bool HFnAttribute::isArray() const {
    return flagOf(object_, &Attribute::array);
}
bool HFnAttribute::isReadable() const {
    return flagOf(object_, &Attribute::readable);
}
bool HFnAttribute::isWritable() const {
    return flagOf(object_, &Attribute::writable);
}
bool HFnAttribute::isConnectable() const {
    return flagOf(object_, &Attribute::connectable);
}
bool HFnAttribute::isStorable() const {
    return flagOf(object_, &Attribute::storable);
}
bool HFnAttribute::isKeyable() const {
    return flagOf(object_, &Attribute::keyable);
}
bool HFnAttribute::isHidden() const {
    return flagOf(object_, &Attribute::hidden);
}
bool HFnAttribute::indexMatters() const {
    return flagOf(object_, &Attribute::indexMatters);
}
bool HFnAttribute::usesArrayDataBuilder() const {
    return flagOf(object_, &Attribute::builder);
}
bool HFnAttribute::isUsedAsFilename() const {
    return flagOf(object_, &Attribute::filename);
}

HFnAttribute::DisconnectBehavior HFnAttribute::disconnectBehavior() const {
    const std::shared_ptr<Attribute> attribute = attached(object_);
    return attribute ? attribute->onDisconnect : kNothing;
}

HStatus HFnAttribute::setArray(bool on) {
    return setFlag(object_, Operation::HFnAttribute_setArray, &Attribute::array, on);
}
HStatus HFnAttribute::setReadable(bool on) {
    return setFlag(object_, Operation::HFnAttribute_setReadable, &Attribute::readable, on);
}
HStatus HFnAttribute::setWritable(bool on) {
    return setFlag(object_, Operation::HFnAttribute_setWritable, &Attribute::writable, on);
}
HStatus HFnAttribute::setConnectable(bool on) {
    return setFlag(object_, Operation::HFnAttribute_setConnectable, &Attribute::connectable, on);
}
HStatus HFnAttribute::setStorable(bool on) {
    return setFlag(object_, Operation::HFnAttribute_setStorable, &Attribute::storable, on);
}
HStatus HFnAttribute::setKeyable(bool on) {
    return setFlag(object_, Operation::HFnAttribute_setKeyable, &Attribute::keyable, on);
}
HStatus HFnAttribute::setHidden(bool on) {
    return setFlag(object_, Operation::HFnAttribute_setHidden, &Attribute::hidden, on);
}
HStatus HFnAttribute::setIndexMatters(bool on) {
    return setFlag(object_, Operation::HFnAttribute_setIndexMatters, &Attribute::indexMatters, on);
}
HStatus HFnAttribute::setUsesArrayDataBuilder(bool on) {
    return setFlag(object_, Operation::HFnAttribute_setUsesArrayDataBuilder, &Attribute::builder, on);
}
HStatus HFnAttribute::setUsedAsFilename(bool on) {
    return setFlag(object_, Operation::HFnAttribute_setUsedAsFilename, &Attribute::filename, on);
}

HStatus HFnAttribute::setDisconnectBehavior(DisconnectBehavior behavior) {
    return changeAttribute(object_, Operation::HFnAttribute_setDisconnectBehavior,
                           [&](Attribute& attribute) -> HStatus {
                               attribute.onDisconnect = behavior;
                               return HStatus::kSuccess;
                           });
}

// --- creation, common ---

namespace {

/// Makes an attribute, lets `fill` complete it, and attaches it. `fill` answers with why it cannot, empty on success.
template <class Fill>
HObject createAttribute(Operation point, HStatus* status, HObject& attachTo, HFn::Type kind, const HString& longName,
                        const HString& shortName, Fill&& fill) {
    return apiValue(point, status, HObject(), [&](HStatus& outcome) {
        attachTo = HObject();
        const std::shared_ptr<Attribute> made =
            OpenQuarn::makeAttribute(kind, longName.asStdString(), shortName.asStdString());
        const std::string why = fill(*made);
        if (!why.empty()) {
            outcome = refused(*made, why);
            return HObject();
        }
        attachTo = Access::object(made);
        return attachTo;
    });
}

std::string setDefaultData(Attribute& attribute, const HObject& value) {
    const auto data = Access::as<OpenQuarn::Data>(value);
    if ((!data && !value.isNull()) || !attribute.accepts(data.get()))
        return "the default value is of another kind";
    attribute.defaultData = data;
    return {};
}

} // namespace

// --- HFnNumericAttribute ---

HFnNumericAttribute::HFnNumericAttribute(const HObject& object, HStatus* status) {
    const HStatus outcome = setObject(object);
    if (status)
        *status = outcome;
}

HObject HFnNumericAttribute::create(const HString& longName, const HString& shortName, HFnNumericData::Type kind,
                                    double defaultValue, HStatus* status) {
    return createAttribute(Operation::HFnNumericAttribute_create, status, object_, HFn::kNumericAttribute, longName,
                           shortName, [&](Attribute& attribute) -> std::string {
                               if (kind < HFnNumericData::kBoolean || kind > HFnNumericData::kDouble)
                                   return "there is no kind of number " + std::to_string(kind);
                               if (std::isnan(defaultValue))
                                   return notANumber("its default");
                               attribute.number = kind;
                               attribute.keyable = true;
                               attribute.defaultNumber = attribute.stored(defaultValue);
                               return {};
                           });
}

HFnNumericData::Type HFnNumericAttribute::numericType() const {
    const std::shared_ptr<Attribute> attribute = attached(object_);
    return attribute ? attribute->number : HFnNumericData::kInvalid;
}

double HFnNumericAttribute::defaultValue() const {
    const std::shared_ptr<Attribute> attribute = attached(object_);
    return attribute ? attribute->defaultNumber : 0.0;
}

HStatus HFnNumericAttribute::setDefault(double value) {
    return changeAttribute(object_, Operation::HFnNumericAttribute_setDefault, [&](Attribute& attribute) -> HStatus {
        if (std::isnan(value))
            return refused(attribute, notANumber("its default"));
        attribute.defaultNumber = attribute.stored(value);
        return HStatus::kSuccess;
    });
}

namespace {

using Limit = std::optional<double> Attribute::*;

/// Of a pair of limits, the lower and the upper one.
std::string outOfOrder(const char* lower, std::optional<double> low, const char* upper, std::optional<double> high) {
    if (!low || !high || *low <= *high)
        return {};
    return std::string("its ") + lower + " " + OpenQuarn::printedNumber(*low) + " is above its " + upper + " " +
           OpenQuarn::printedNumber(*high);
}

HStatus setLimit(const HObject& object, Operation point, Limit limit, double value) {
    return changeAttribute(object, point, [&](Attribute& attribute) -> HStatus {
        if (std::isnan(value))
            return refused(attribute, notANumber("its limit"));
        const std::optional<double> before = std::exchange(attribute.*limit, value);
        std::string why = outOfOrder("min", attribute.min, "max", attribute.max);
        if (why.empty())
            why = outOfOrder("softMin", attribute.softMin, "softMax", attribute.softMax);
        if (why.empty())
            return HStatus::kSuccess;
        attribute.*limit = before;
        return refused(attribute, why);
    });
}

double getLimit(const HObject& object, Operation point, Limit limit, HStatus* status) {
    return apiValue(point, status, 0.0, [&](HStatus& outcome) {
        const std::shared_ptr<Attribute> attribute = attached(object);
        if (attribute && (*attribute).*limit)
            return *((*attribute).*limit);
        outcome = attribute ? HStatus(HStatus::kFailure, "attribute '" + attribute->name + "' has no such limit")
                            : nothingAttached();
        return 0.0;
    });
}

bool hasLimit(const HObject& object, Limit limit) {
    const std::shared_ptr<Attribute> attribute = attached(object);
    return attribute && (*attribute).*limit;
}

} // namespace

HStatus HFnNumericAttribute::setMin(double value) {
    return setLimit(object_, Operation::HFnNumericAttribute_setMin, &Attribute::min, value);
}
HStatus HFnNumericAttribute::setMax(double value) {
    return setLimit(object_, Operation::HFnNumericAttribute_setMax, &Attribute::max, value);
}
HStatus HFnNumericAttribute::setSoftMin(double value) {
    return setLimit(object_, Operation::HFnNumericAttribute_setSoftMin, &Attribute::softMin, value);
}
HStatus HFnNumericAttribute::setSoftMax(double value) {
    return setLimit(object_, Operation::HFnNumericAttribute_setSoftMax, &Attribute::softMax, value);
}
bool HFnNumericAttribute::hasMin() const {
    return hasLimit(object_, &Attribute::min);
}
bool HFnNumericAttribute::hasMax() const {
    return hasLimit(object_, &Attribute::max);
}
bool HFnNumericAttribute::hasSoftMin() const {
    return hasLimit(object_, &Attribute::softMin);
}
bool HFnNumericAttribute::hasSoftMax() const {
    return hasLimit(object_, &Attribute::softMax);
}
double HFnNumericAttribute::getMin(HStatus* status) const {
    return getLimit(object_, Operation::HFnNumericAttribute_getMin, &Attribute::min, status);
}
double HFnNumericAttribute::getMax(HStatus* status) const {
    return getLimit(object_, Operation::HFnNumericAttribute_getMax, &Attribute::max, status);
}
double HFnNumericAttribute::getSoftMin(HStatus* status) const {
    return getLimit(object_, Operation::HFnNumericAttribute_getSoftMin, &Attribute::softMin, status);
}
double HFnNumericAttribute::getSoftMax(HStatus* status) const {
    return getLimit(object_, Operation::HFnNumericAttribute_getSoftMax, &Attribute::softMax, status);
}

// --- HFnTypedAttribute ---

HFnTypedAttribute::HFnTypedAttribute(const HObject& object, HStatus* status) {
    const HStatus outcome = setObject(object);
    if (status)
        *status = outcome;
}

HObject HFnTypedAttribute::create(const HString& longName, const HString& shortName, HFnData::Type kind,
                                  const HObject& defaultValue, HStatus* status) {
    return createAttribute(
        Operation::HFnTypedAttribute_create, status, object_, HFn::kTypedAttribute, longName, shortName,
        [&](Attribute& attribute) -> std::string {
            constexpr std::array kinds = {HFnData::kString, HFnData::kMatrix, HFnData::kDoubleArray, HFnData::kMesh};
            if (std::find(kinds.begin(), kinds.end(), kind) == kinds.end())
                return "there is no kind of data " + std::to_string(kind);
            attribute.data = kind;
            return setDefaultData(attribute, defaultValue);
        });
}

HObject HFnTypedAttribute::create(const HString& longName, const HString& shortName, const HTypeId& pluginDataType,
                                  const HObject& defaultValue, HStatus* status) {
    return createAttribute(Operation::HFnTypedAttribute_create, status, object_, HFn::kTypedAttribute, longName,
                           shortName, [&](Attribute& attribute) -> std::string {
                               if (pluginDataType.id() == 0)
                                   return "0 is no type id";
                               attribute.data = HFnData::kPlugin;
                               attribute.pluginData = pluginDataType;
                               return setDefaultData(attribute, defaultValue);
                           });
}

HFnData::Type HFnTypedAttribute::attrType() const {
    const std::shared_ptr<Attribute> attribute = attached(object_);
    return attribute ? attribute->data : HFnData::kInvalid;
}

// --- HFnEnumAttribute ---

HFnEnumAttribute::HFnEnumAttribute(const HObject& object, HStatus* status) {
    const HStatus outcome = setObject(object);
    if (status)
        *status = outcome;
}

HObject HFnEnumAttribute::create(const HString& longName, const HString& shortName, short defaultValue,
                                 HStatus* status) {
    return createAttribute(Operation::HFnEnumAttribute_create, status, object_, HFn::kEnumAttribute, longName,
                           shortName, [&](Attribute& attribute) -> std::string {
                               attribute.number = HFnNumericData::kShort;
                               attribute.keyable = true;
                               attribute.defaultNumber = defaultValue;
                               return {};
                           });
}

HStatus HFnEnumAttribute::addField(const HString& label, short value) {
    return changeAttribute(object_, Operation::HFnEnumAttribute_addField, [&](Attribute& attribute) -> HStatus {
        for (const auto& [other, number] : attribute.fields) {
            if (number == value)
                return {HStatus::kFailure, "attribute '" + attribute.name + "' labels " + std::to_string(value) +
                                               " as '" + other + "' already"};
            if (label == other.c_str())
                return {HStatus::kFailure, "attribute '" + attribute.name + "' has the label '" + other + "' for " +
                                               std::to_string(number) + " already"};
        }
        attribute.fields.emplace_back(label.asStdString(), value);
        return HStatus::kSuccess;
    });
}

HString HFnEnumAttribute::fieldName(short value, HStatus* status) const {
    return apiValue(Operation::HFnEnumAttribute_fieldName, status, HString(), [&](HStatus& outcome) {
        if (const std::shared_ptr<Attribute> attribute = attached(object_))
            for (const auto& [label, number] : attribute->fields)
                if (number == value)
                    return HString(label);
        outcome = {HStatus::kNotFound, "'" + name().asStdString() + "' has no label for " + std::to_string(value)};
        return HString();
    });
}

short HFnEnumAttribute::fieldIndex(const HString& label, HStatus* status) const {
    return apiValue(Operation::HFnEnumAttribute_fieldIndex, status, short{0}, [&](HStatus& outcome) {
        if (const std::shared_ptr<Attribute> attribute = attached(object_))
            for (const auto& [text, number] : attribute->fields)
                if (text == label.asStdString())
                    return number;
        outcome = {HStatus::kNotFound, "'" + name().asStdString() + "' has no field '" + label.asStdString() + "'"};
        return short{0};
    });
}

short HFnEnumAttribute::defaultValue() const {
    const std::shared_ptr<Attribute> attribute = attached(object_);
    return attribute ? static_cast<short>(attribute->defaultNumber) : short{0};
}

HStatus HFnEnumAttribute::setDefault(short value) {
    return changeAttribute(object_, Operation::HFnEnumAttribute_setDefault, [&](Attribute& attribute) -> HStatus {
        attribute.defaultNumber = value;
        return HStatus::kSuccess;
    });
}

// --- HFnCompoundAttribute ---

HFnCompoundAttribute::HFnCompoundAttribute(const HObject& object, HStatus* status) {
    const HStatus outcome = setObject(object);
    if (status)
        *status = outcome;
}

HObject HFnCompoundAttribute::create(const HString& longName, const HString& shortName, HStatus* status) {
    return createAttribute(Operation::HFnCompoundAttribute_create, status, object_, HFn::kCompoundAttribute, longName,
                           shortName, [](Attribute&) { return std::string(); });
}

namespace {

bool isAtOrAbove(const Attribute& above, const Attribute& attribute) {
    const std::shared_ptr<Attribute> parent = attribute.parent.lock();
    return &above == &attribute || (parent && isAtOrAbove(above, *parent));
}

} // namespace

HStatus HFnCompoundAttribute::addChild(const HObject& child) {
    return changeAttribute(object_, Operation::HFnCompoundAttribute_addChild, [&](Attribute& attribute) -> HStatus {
        const std::shared_ptr<Attribute> added = attached(child);
        if (!added)
            return {HStatus::kInvalidParameter, "the child is no attribute"};
        if (!added->parent.expired() || added->fixed || isAtOrAbove(*added, attribute))
            return {HStatus::kFailure, "attribute '" + added->name + "' has its place already"};
        for (const std::shared_ptr<Attribute>& other : attribute.children)
            if (other->name == added->name || other->shortName == added->shortName)
                return {HStatus::kFailure,
                        "'" + attribute.name + "' has a child named '" + other->name + "' (" + other->shortName + ")"};
        added->parent = std::static_pointer_cast<Attribute>(attribute.shared_from_this());
        attribute.children.push_back(added);
        return HStatus::kSuccess;
    });
}

unsigned HFnCompoundAttribute::numChildren() const {
    const std::shared_ptr<Attribute> attribute = attached(object_);
    return attribute ? static_cast<unsigned>(attribute->children.size()) : 0U;
}

HObject HFnCompoundAttribute::child(unsigned index, HStatus* status) const {
    return apiValue(Operation::HFnCompoundAttribute_child, status, HObject(), [&](HStatus& outcome) {
        const std::shared_ptr<Attribute> attribute = attached(object_);
        if (attribute && index < attribute->children.size())
            return Access::object(attribute->children[index]);
        outcome = {HStatus::kFailure, "'" + name().asStdString() + "' has no child number " + std::to_string(index)};
        return HObject();
    });
}

// --- HFnMessageAttribute, HFnMatrixAttribute ---

HFnMessageAttribute::HFnMessageAttribute(const HObject& object, HStatus* status) {
    const HStatus outcome = setObject(object);
    if (status)
        *status = outcome;
}

HObject HFnMessageAttribute::create(const HString& longName, const HString& shortName, HStatus* status) {
    return createAttribute(Operation::HFnMessageAttribute_create, status, object_, HFn::kMessageAttribute, longName,
                           shortName, [](Attribute&) { return std::string(); });
}

HFnMatrixAttribute::HFnMatrixAttribute(const HObject& object, HStatus* status) {
    const HStatus outcome = setObject(object);
    if (status)
        *status = outcome;
}

HObject HFnMatrixAttribute::create(const HString& longName, const HString& shortName, HStatus* status) {
    return createAttribute(Operation::HFnMatrixAttribute_create, status, object_, HFn::kMatrixAttribute, longName,
                           shortName, [](Attribute& attribute) {
                               attribute.data = HFnData::kMatrix;
                               attribute.defaultData =
                                   std::make_shared<OpenQuarn::MatrixData>(OpenQuarn::identityMatrix);
                               return std::string();
                           });
}
