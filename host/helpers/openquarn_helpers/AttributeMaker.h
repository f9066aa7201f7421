// SPDX-License-Identifier: Apache-2.0
// Makes the attributes of a node type, in its initializer.
#pragma once

#include "openquarn/HFnAttribute.h"
#include "openquarn/HPxNode.h"

#include <initializer_list>
#include <optional>

namespace openquarn_helpers {

/// What an attribute has beyond its name and kind; the host's defaults where nothing is said.
struct AttributeFlags {
    bool array = false;
    bool builder = false; ///< HArrayDataHandle::builder() may be asked for
    bool writable = true;
    bool storable = true;
    bool keyable = true; ///< if its kind is
    bool hidden = false;
    bool indexMatters = true;
    bool filename = false;
    HFnAttribute::DisconnectBehavior onDisconnect = HFnAttribute::kNothing;
};

/// Of what nobody but compute() writes, and what can be computed again.
constexpr AttributeFlags outputFlags{.writable = false, .storable = false, .keyable = false};

/// Of a number, in its own unit; none where nothing is said. Hard limits hold, soft ones are advice for sliders.
struct NumberLimits {
    std::optional<double> min = {}, max = {}, softMin = {}, softMax = {};
};

/// Makes attributes, adds them to the type whose initializer is running, and remembers the first failure: what comes
/// after it changes nothing that matters, for a type whose initializer fails is not registered. Names are the long and
/// the short one, as HFnAttribute has them; what could not be made is null. [main] throughout.
class AttributeMaker {
public:
    HObject number(const char* longName, const char* shortName, HFnNumericData::Type kind, double defaultValue,
                   const AttributeFlags& flags = {}, const NumberLimits& limits = {}) {
        HFnNumericAttribute set;
        HObject made =
            noted([&](HStatus* status) { return set.create(longName, shortName, kind, defaultValue, status); });
        if (limits.min)
            note(set.setMin(*limits.min));
        if (limits.max)
            note(set.setMax(*limits.max));
        if (limits.softMin)
            note(set.setSoftMin(*limits.softMin));
        if (limits.softMax)
            note(set.setSoftMax(*limits.softMax));
        setFlags(made, flags);
        return made;
    }

    /// A double.
    HObject real(const char* longName, const char* shortName, double defaultValue = 0.0,
                 const AttributeFlags& flags = {}) {
        return number(longName, shortName, HFnNumericData::kDouble, defaultValue, flags);
    }

    HObject boolean(const char* longName, const char* shortName, bool defaultValue, const AttributeFlags& flags = {}) {
        return number(longName, shortName, HFnNumericData::kBoolean, defaultValue ? 1.0 : 0.0, flags);
    }

    /// The labels stand for 0, 1, 2 ...
    HObject choice(const char* longName, const char* shortName, std::initializer_list<HString> labels,
                   short defaultValue = 0) {
        HFnEnumAttribute set;
        HObject made = noted([&](HStatus* status) { return set.create(longName, shortName, defaultValue, status); });
        short value = 0;
        for (const HString& label : labels)
            note(set.addField(label, value++));
        return made;
    }

    /// The six orders, with the numbers of HEulerRotation::RotationOrder.
    HObject rotationOrder(const char* longName, const char* shortName) {
        return choice(longName, shortName, {"xyz", "yzx", "zxy", "xzy", "yxz", "zyx"});
    }

    /// A matrix that is the identity until it is set.
    HObject matrix(const char* longName, const char* shortName, const AttributeFlags& flags = {}) {
        return flagged(flags,
                       [&](HStatus* status) { return HFnMatrixAttribute().create(longName, shortName, status); });
    }

    /// Data of a kind: `defaultValue` until it is set, which may be null for none.
    HObject data(const char* longName, const char* shortName, HFnData::Type kind, const AttributeFlags& flags = {},
                 const HObject& defaultValue = HObject::kNullObj) {
        return flagged(flags, [&](HStatus* status) {
            return HFnTypedAttribute().create(longName, shortName, kind, defaultValue, status);
        });
    }

    /// Data of a plug-in's own type; none until it is set.
    HObject data(const char* longName, const char* shortName, const HTypeId& type, const AttributeFlags& flags = {}) {
        return flagged(flags, [&](HStatus* status) {
            return HFnTypedAttribute().create(longName, shortName, type, HObject::kNullObj, status);
        });
    }

    HObject message(const char* longName, const char* shortName, const AttributeFlags& flags = {}) {
        return flagged(flags,
                       [&](HStatus* status) { return HFnMessageAttribute().create(longName, shortName, status); });
    }

    HObject compound(const char* longName, const char* shortName, std::initializer_list<HObject> children,
                     const AttributeFlags& flags = {}) {
        HFnCompoundAttribute set;
        HObject made = noted([&](HStatus* status) { return set.create(longName, shortName, status); });
        for (const HObject& child : children)
            note(set.addChild(child));
        setFlags(made, flags);
        return made;
    }

    /// Adds attributes that have no parent, with their children.
    void add(std::initializer_list<HObject> attributes) {
        for (const HObject& attribute : attributes)
            note(HPxNode::addAttribute(attribute));
    }

    /// A change of an input changes each output; `affectsTree`: so does a change of anything below it.
    void affects(std::initializer_list<HObject> inputs, std::initializer_list<HObject> outputs,
                 bool affectsTree = false) {
        for (const HObject& input : inputs)
            for (const HObject& output : outputs)
                note(HPxNode::attributeAffects(input, output, affectsTree));
    }

    /// Keeps a failing status when it is the first.
    void note(const HStatus& status) {
        if (!status_.error())
            status_ = status;
    }

    /// The first failure; success without one.
    const HStatus& status() const { return status_; }

private:
    template <class Make>
    HObject noted(Make&& make) {
        HStatus status;
        HObject made = make(&status);
        note(status);
        return made;
    }

    template <class Make>
    HObject flagged(const AttributeFlags& flags, Make&& make) {
        HObject made = noted(make);
        setFlags(made, flags);
        return made;
    }

    void setFlags(const HObject& attribute, const AttributeFlags& flags) {
        HFnAttribute set(attribute);
        if (flags.array)
            note(set.setArray(true));
        if (flags.builder)
            note(set.setUsesArrayDataBuilder(true));
        if (!flags.writable)
            note(set.setWritable(false));
        if (!flags.storable)
            note(set.setStorable(false));
        if (!flags.keyable)
            note(set.setKeyable(false));
        if (flags.hidden)
            note(set.setHidden(true));
        if (!flags.indexMatters)
            note(set.setIndexMatters(false));
        if (flags.filename)
            note(set.setUsedAsFilename(true));
        if (flags.onDisconnect != HFnAttribute::kNothing)
            note(set.setDisconnectBehavior(flags.onDisconnect));
    }

    HStatus status_;
};

} // namespace openquarn_helpers
