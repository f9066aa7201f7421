// SPDX-License-Identifier: Apache-2.0
// The values of one node, as its compute() reads and writes them.
#pragma once

#include "openquarn/HDGContext.h"
#include "openquarn/HFnData.h"
#include "openquarn/HObject.h"
#include "openquarn/HStatus.h"
#include "openquarn/HString.h"

#include <memory>

class HArrayDataBuilder;
class HArrayDataHandle;
class HDataHandle;
class HMatrix;
class HPlug;
class HPxData;

namespace OpenQuarn {
class NodeData;
class Slot;
struct ArrayBuild;
} // namespace OpenQuarn

/// A handle on the data of a node in one evaluation context. Reading an input evaluates it first; nothing that is
/// written here is announced to anybody: what depends on it must be asked for by the graph. Outputs may be written
/// during compute(), deform() and the per-geometry hook only. [eval] throughout.
class OPENQUARN_API HDataBlock {
public:
    HDataBlock();
    /// The value of an input, evaluated. Of a compound, everything below it. Invalid, and a failure, when the attribute
    /// is an array or not of this node. A failing upstream compute() is reported where it happens: the handle then has
    /// the last value.
    HDataHandle inputValue(const HObject& attribute, HStatus* status = nullptr);
    HDataHandle inputValue(const HPlug& plug, HStatus* status = nullptr);
    /// All elements of an array, evaluated; stands on the first. Invalid, and a failure, when the attribute is no
    /// array; a child of an array compound is reached through its parent's handle.
    HArrayDataHandle inputArrayValue(const HObject& attribute, HStatus* status = nullptr);
    /// A place to write. Evaluates nothing.
    HDataHandle outputValue(const HObject& attribute, HStatus* status = nullptr);
    /// A place to write; an element that is missing is made.
    HDataHandle outputValue(const HPlug& plug, HStatus* status = nullptr);
    /// The elements of any array, input or output, as they are: evaluates nothing. What
    /// HArrayDataHandle::inputValue() then reads is evaluated, element by element.
    HArrayDataHandle outputArrayValue(const HObject& attribute, HStatus* status = nullptr);
    /// Says that the plug's value is up to date.
    HStatus setClean(const HPlug& plug);
    HStatus setClean(const HObject& attribute);
    bool isClean(const HPlug& plug) const;
    /// The context that the data belongs to. [any]
    HDGContext context() const;

private:
    friend class OpenQuarn::Access;
    explicit HDataBlock(std::shared_ptr<OpenQuarn::NodeData> impl);
    std::shared_ptr<OpenQuarn::NodeData> impl_;
};

/// A handle on one value. It stays safe when the value's element is removed: reads then give the last value, and writes
/// reach nobody. Reads of another kind than the value's give 0, "", null or the identity; numbers convert to each
/// other. [eval] throughout.
class OPENQUARN_API HDataHandle {
public:
    HDataHandle();
    bool isValid() const; ///< [any]
    /// kMesh (14) for a mesh, kNumeric for numbers and enums, kInvalid for a data attribute that holds nothing.
    HFnData::Type type() const;
    HFnNumericData::Type numericType() const; ///< [any]
    HObject attribute() const;                ///< [any]

    bool asBool() const;
    short asShort() const;
    int asInt() const;
    float asFloat() const;
    double asDouble() const;
    HString asString() const;
    HMatrix asMatrix() const;
    /// The mesh; null when it is none.
    HObject asMesh() const;
    /// The data object of any kind; null for numbers, and when there is none.
    HObject data() const;
    /// The plug-in's object, owned by the host; null when there is none.
    HPxData* asPluginData() const;

    /// A child of a compound; invalid when it has no such child.
    HDataHandle child(const HObject& attribute) const;
    /// A child of a compound that is an array; stands on its first element. Fails when there is no such child.
    HArrayDataHandle childArray(const HObject& attribute, HStatus* status = nullptr) const;

    /// Write the value. Fail when the handle is invalid or the value is of another kind.
    HStatus set(bool value);
    HStatus set(short value);
    HStatus set(int value);
    HStatus set(float value);
    HStatus set(double value);
    HStatus set(const HString& value);
    HStatus set(const char* value);
    HStatus set(const HMatrix& value);
    /// Data of the attribute's kind, shared from now on; null for none.
    HStatus set(const HObject& data);
    /// A plug-in's object that HFnPluginData::create() made.
    HStatus set(HPxData* data);
    /// Takes over value, children and elements of another handle of the same kind of attribute; data is shared.
    HStatus copy(const HDataHandle& source);
    void setClean();

private:
    friend class OpenQuarn::Access;
    friend class HArrayDataHandle;
    explicit HDataHandle(std::shared_ptr<OpenQuarn::Slot> impl);
    std::shared_ptr<OpenQuarn::Slot> impl_;
};

/// A handle on the elements of an array, in ascending order of their logical indices; it stands on one element, or
/// beyond the last. [eval] throughout.
class OPENQUARN_API HArrayDataHandle {
public:
    HArrayDataHandle();
    /// The array child of a compound value. Fails when the value is no array.
    explicit HArrayDataHandle(const HDataHandle& array, HStatus* status = nullptr);
    bool isValid() const; ///< [any]
    unsigned elementCount() const;
    /// Logical index of the element it stands on. Fails beyond the last.
    unsigned elementIndex(HStatus* status = nullptr) const;
    /// Goes on to the next element. Fails, and stands beyond the last, when there is none.
    HStatus next();
    /// Goes to the element with that logical index. Fails when there is none, and stays where it was.
    HStatus jumpToElement(unsigned logicalIndex);
    /// The same; kept beside jumpToElement() for readers that stress that the index is the array's own.
    HStatus jumpToArrayElement(unsigned logicalIndex);
    /// Goes to the `position`-th element that exists. Fails when there are not so many, and stays where it was.
    HStatus jumpToPosition(unsigned position);
    /// The element's value, evaluated now if it has to be. Invalid, and a failure, beyond the last.
    HDataHandle inputValue(HStatus* status = nullptr);
    /// The element as a place to write; evaluates nothing. Invalid, and a failure, beyond the last.
    HDataHandle outputValue(HStatus* status = nullptr);
    /// Adds and removes elements. Fails when the attribute does not use array data builders.
    HArrayDataBuilder builder(HStatus* status = nullptr);
    /// Makes what the builder added and removed take effect; the handle stands on the first element afterwards. Fails,
    /// and changes nothing, for the builder of another array.
    HStatus set(HArrayDataBuilder& builder);
    /// Says that the array and all of its elements are up to date.
    HStatus setAllClean();
    /// The same for the element it stands on.
    HStatus setClean();

private:
    friend class OpenQuarn::Access;
    explicit HArrayDataHandle(std::shared_ptr<OpenQuarn::Slot> impl);
    std::shared_ptr<OpenQuarn::Slot> impl_;
    std::shared_ptr<OpenQuarn::Slot> current_;
};

/// Adds and removes elements of an array. Nothing of it is seen in the array before HArrayDataHandle::set(), except
/// that an element which exists already is written to directly. [eval] throughout.
class OPENQUARN_API HArrayDataBuilder {
public:
    HArrayDataBuilder();
    /// The element with that logical index, added when it is missing. Invalid on failure.
    HDataHandle addElement(unsigned logicalIndex, HStatus* status = nullptr);
    /// Fails when there is no such element.
    HStatus removeElement(unsigned logicalIndex);
    /// Number of elements that the array will have.
    unsigned elementCount() const;

private:
    friend class OpenQuarn::Access;
    explicit HArrayDataBuilder(std::shared_ptr<OpenQuarn::ArrayBuild> impl);
    std::shared_ptr<OpenQuarn::ArrayBuild> impl_;
};
