// SPDX-License-Identifier: Apache-2.0
// Attributes: the definition of what a node type's nodes have.
#pragma once

#include "openquarn/HFnBase.h"
#include "openquarn/HFnData.h"
#include "openquarn/HString.h"
#include "openquarn/HTypeId.h"

/// What every kind of attribute has. A new attribute is not an array, readable, writable, connectable, storable, not
/// hidden, keyable when it is numeric, and its array elements keep their index. Flags are set between create() and
/// HPxNode::addAttribute(): afterwards the attribute is fixed and a set call fails. [any] unless a call says otherwise.
class OPENQUARN_API HFnAttribute : public HFnBase {
public:
    /// What happens to an element whose incoming connection is broken.
    enum DisconnectBehavior : int {
        kNothing = 0, ///< It keeps the last value. This is the default.
        kReset = 1,   ///< It takes the default value.
        kDelete = 2,  ///< The element is removed; an attribute that is no element does as kNothing says.
    };

    HFnAttribute() = default;
    /// Fails as setObject() does.
    explicit HFnAttribute(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kAttribute; }

    HString name() const; ///< Long name; "" when nothing is attached, as for shortName().
    HString shortName() const;
    /// The compound that this is a child of; null when there is none.
    HObject parent() const;

    bool isArray() const;
    bool isReadable() const;
    bool isWritable() const;
    bool isConnectable() const;
    bool isStorable() const;
    bool isKeyable() const;
    bool isHidden() const;
    bool indexMatters() const;
    bool usesArrayDataBuilder() const;
    bool isUsedAsFilename() const;
    DisconnectBehavior disconnectBehavior() const;

    /// Makes the attribute a sparse array, whose elements are found by logical index. [main], as for all set calls.
    HStatus setArray(bool on);
    /// May be the source of a connection.
    HStatus setReadable(bool on);
    /// May be set, and be the destination of a connection. An attribute that is not writable is an output.
    HStatus setWritable(bool on);
    HStatus setConnectable(bool on);
    /// Values that differ from the default are saved with the scene.
    HStatus setStorable(bool on);
    HStatus setKeyable(bool on);
    HStatus setHidden(bool on);
    /// False: the index of an element has no meaning of its own.
    HStatus setIndexMatters(bool on);
    /// Allows HArrayDataHandle::builder() on the array.
    HStatus setUsesArrayDataBuilder(bool on);
    /// The text is the path of a file or folder.
    HStatus setUsedAsFilename(bool on);
    HStatus setDisconnectBehavior(DisconnectBehavior behavior);
};

/// Numbers. A value outside of hard limits is brought to the nearer one when a plug or a command sets it; soft limits
/// are advice for sliders.
class OPENQUARN_API HFnNumericAttribute : public HFnAttribute {
public:
    HFnNumericAttribute() = default;
    /// Fails as setObject() does.
    explicit HFnNumericAttribute(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kNumericAttribute; }
    /// Makes a new attribute and attaches the set to it; null on failure (an unusable name, a default that is NaN).
    /// `defaultValue` in the attribute's own unit. [main]
    HObject create(const HString& longName, const HString& shortName, HFnNumericData::Type kind,
                   double defaultValue = 0.0, HStatus* status = nullptr);
    /// These fail for NaN, and for a limit that would put a min above its max; what was set before stays.
    HStatus setDefault(double value);
    HStatus setMin(double value);
    HStatus setMax(double value);
    HStatus setSoftMin(double value);
    HStatus setSoftMax(double value);

    HFnNumericData::Type numericType() const;
    double defaultValue() const;
    bool hasMin() const;
    bool hasMax() const;
    bool hasSoftMin() const;
    bool hasSoftMax() const;
    /// Each limit as it was set; 0 when it was not. They fail when there is no such limit.
    double getMin(HStatus* status = nullptr) const;
    double getMax(HStatus* status = nullptr) const;
    double getSoftMin(HStatus* status = nullptr) const;
    double getSoftMax(HStatus* status = nullptr) const;
};

/// Data objects: texts, matrices, meshes, data of plug-ins.
class OPENQUARN_API HFnTypedAttribute : public HFnAttribute {
public:
    HFnTypedAttribute() = default;
    /// Fails as setObject() does.
    explicit HFnTypedAttribute(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kTypedAttribute; }
    /// Makes a new attribute and attaches the set to it; null on failure. `defaultValue` data of that kind, or null for
    /// none. [main]
    HObject create(const HString& longName, const HString& shortName, HFnData::Type kind,
                   const HObject& defaultValue = HObject::kNullObj, HStatus* status = nullptr);
    /// The same for the data type that a plug-in registered under this id. [main]
    HObject create(const HString& longName, const HString& shortName, const HTypeId& pluginDataType,
                   const HObject& defaultValue = HObject::kNullObj, HStatus* status = nullptr);

    HFnData::Type attrType() const;
};

/// One of a list of labelled numbers, kept as a 16-bit number. A number without a label may be set all the same.
class OPENQUARN_API HFnEnumAttribute : public HFnAttribute {
public:
    HFnEnumAttribute() = default;
    /// Fails as setObject() does.
    explicit HFnEnumAttribute(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kEnumAttribute; }
    /// Makes a new attribute and attaches the set to it; null on failure. [main]
    HObject create(const HString& longName, const HString& shortName, short defaultValue = 0,
                   HStatus* status = nullptr);
    /// Fails when the number has a label already, or the label a number. [main]
    HStatus addField(const HString& label, short value);
    HStatus setDefault(short value);

    /// "" for a number without a label, which fails.
    HString fieldName(short value, HStatus* status = nullptr) const;
    /// 0 for a label that no number has, which fails.
    short fieldIndex(const HString& label, HStatus* status = nullptr) const;
    short defaultValue() const;
};

/// A group of attributes that are read, connected and made arrays together.
class OPENQUARN_API HFnCompoundAttribute : public HFnAttribute {
public:
    HFnCompoundAttribute() = default;
    /// Fails as setObject() does.
    explicit HFnCompoundAttribute(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kCompoundAttribute; }
    /// Makes a new attribute and attaches the set to it; null on failure. [main]
    HObject create(const HString& longName, const HString& shortName, HStatus* status = nullptr);
    /// Fails when the child has a parent already or one of its names is taken. [main]
    HStatus addChild(const HObject& child);

    unsigned numChildren() const;
    /// Null, and a failure, when there is no such child.
    HObject child(unsigned index, HStatus* status = nullptr) const;
};

/// A connection without a value.
class OPENQUARN_API HFnMessageAttribute : public HFnAttribute {
public:
    HFnMessageAttribute() = default;
    /// Fails as setObject() does.
    explicit HFnMessageAttribute(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kMessageAttribute; }
    /// Makes a new attribute and attaches the set to it; null on failure. [main]
    HObject create(const HString& longName, const HString& shortName, HStatus* status = nullptr);
};

/// A matrix that defaults to the identity; as a typed attribute of kind kMatrix without a default would be null.
class OPENQUARN_API HFnMatrixAttribute : public HFnAttribute {
public:
    HFnMatrixAttribute() = default;
    /// Fails as setObject() does.
    explicit HFnMatrixAttribute(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kMatrixAttribute; }
    /// Makes a new attribute and attaches the set to it; null on failure. [main]
    HObject create(const HString& longName, const HString& shortName, HStatus* status = nullptr);
};
