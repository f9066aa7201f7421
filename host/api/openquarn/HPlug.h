// SPDX-License-Identifier: Apache-2.0
// A plug: one attribute of one node, with the indices that lead to it.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HStatus.h"
#include "openquarn/HString.h"

#include <memory>
#include <vector>

class HDataHandle;
class HMatrix;
class HPlug;

/// Plugs in an order that the call says.
using HPlugArray = std::vector<HPlug>;

/// Names a place on a node: an attribute, an element of an array attribute, a child of a compound. A plug may name an
/// element that does not exist yet: setting or connecting it makes it, reading it gives the attribute's default.
/// Copyable; a plug of a deleted node is null. Calls on a null plug fail with kInvalidParameter. [any] unless a call
/// says otherwise.
class OPENQUARN_API HPlug {
public:
    HPlug();
    /// The whole attribute on the node (its array, when it is one); for a child of an array compound, no element is
    /// chosen yet: see selectAncestorLogicalIndex(). Null when the node has no such attribute.
    HPlug(const HObject& node, const HObject& attribute);

    bool isNull() const;
    HObject node() const;
    HObject attribute() const;
    /// "node.list[3].child", long names; an index that is not chosen yet shows as [-1]; "" when null.
    HString name() const;
    /// The name without the node's.
    HString partialName() const;
    bool operator==(const HPlug& other) const;
    bool operator!=(const HPlug& other) const { return !(*this == other); }
    /// True when the attribute of the plug is that one.
    bool operator==(const HObject& attribute) const;
    bool operator!=(const HObject& attribute) const { return !(*this == attribute); }

    bool isArray() const;   ///< Names a whole array.
    bool isElement() const; ///< Names an element of an array.
    bool isCompound() const;
    bool isChild() const;

    /// Index of the element that the plug names. Fails when it is no element.
    unsigned logicalIndex(HStatus* status = nullptr) const;
    /// Number of elements that exist. Fails when it is no array.
    unsigned numElements(HStatus* status = nullptr) const;
    /// Logical indices of the elements that exist, ascending; `indices` is replaced. Fails when it is no array.
    HStatus getExistingArrayAttributeIndices(std::vector<unsigned>& indices) const;
    /// The element with that index, which need not exist. Null when it is no array.
    HPlug elementByLogicalIndex(unsigned index, HStatus* status = nullptr) const;
    /// The `position`-th of the elements that exist, in ascending order of index. Null, and a failure, beyond the last.
    HPlug elementByPhysicalIndex(unsigned position, HStatus* status = nullptr) const;
    /// The array that this element belongs to. Null, and a failure, when it is no element.
    HPlug array(HStatus* status = nullptr) const;
    unsigned numChildren(HStatus* status = nullptr) const;
    /// The `number`-th child of a compound. Null, and a failure, when there is none.
    HPlug child(unsigned number, HStatus* status = nullptr) const;
    HPlug child(const HObject& attribute, HStatus* status = nullptr) const;
    /// The compound that this is a child of. Null, and a failure, when there is none.
    HPlug parent(HStatus* status = nullptr) const;
    /// Chooses the element of the nearest array at or above this plug's attribute; with `ancestor`, that attribute's.
    /// Fails when there is no such array.
    HStatus selectAncestorLogicalIndex(unsigned index, const HObject& ancestor = HObject::kNullObj);

    /// True when a connection begins or ends at this very plug.
    bool isConnected() const;
    bool isDestination() const;
    bool isSource() const;
    /// The plug connected into this one; null, with success, when there is none. For an element or child of a plug that
    /// is connected as a whole, the part of that source.
    HPlug source(HStatus* status = nullptr) const;
    /// The plugs that this one is connected into, in order of connection; `plugs` is replaced.
    HStatus destinations(HPlugArray& plugs) const;

    bool isLocked() const;
    /// A locked plug cannot be set or connected into. [main]
    HStatus setLocked(bool on);

    /// The value, evaluated first when it is dirty. On failure 0, "", null or the identity, and when the value is of
    /// another kind: numbers convert to each other (rounding to nearest, staying in range), nothing else does. When its
    /// compute fails the value is the last one and the status that of the compute. [eval]
    bool asBool(HStatus* status = nullptr) const;
    short asShort(HStatus* status = nullptr) const;
    int asInt(HStatus* status = nullptr) const;
    float asFloat(HStatus* status = nullptr) const;
    double asDouble(HStatus* status = nullptr) const;
    HString asString(HStatus* status = nullptr) const;
    HMatrix asMatrix(HStatus* status = nullptr) const;
    /// The data object; null when the plug holds none.
    HObject asHObject(HStatus* status = nullptr) const;

    /// Set the value, make everything that depends on it dirty, and tell who asked to be told. Fail, and change
    /// nothing, when the plug is not writable, locked, connected into, or of another kind. [main]
    HStatus setBool(bool value);
    HStatus setShort(short value);
    HStatus setInt(int value);
    HStatus setFloat(float value);
    HStatus setDouble(double value);
    HStatus setString(const HString& value);
    HStatus setMatrix(const HMatrix& value);
    /// `data` of the attribute's kind, or null for none.
    HStatus setHObject(const HObject& data);

    /// A handle on the plug's evaluated data, to be given back with destructHandle(). Invalid on failure. [eval]
    HDataHandle asHDataHandle(HStatus* status = nullptr) const;
    /// Gives the handle back: afterwards it is invalid. [eval]
    HStatus destructHandle(HDataHandle& handle) const;

    struct Impl; ///< the host's own

private:
    friend class OpenQuarn::Access;
    explicit HPlug(std::shared_ptr<const Impl> impl);
    std::shared_ptr<const Impl> impl_;
};
