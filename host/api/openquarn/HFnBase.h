// SPDX-License-Identifier: Apache-2.0
// What all function sets share.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HStatus.h"

/// A function set gives the operations of one kind of object to a handle that is attached to it. It owns nothing.
/// `[any]`; the operations of each set carry their own tags.
class OPENQUARN_API HFnBase {
public:
    virtual ~HFnBase();
    /// Kind of object that the set works on.
    virtual HFn::Type type() const = 0;

    /// Attaches the set to an object. Fails with kInvalidParameter, and detaches, when the object is null or its kind
    /// does not fit. [any]
    HStatus setObject(const HObject& object);
    /// The attached object; null when there is none. [any]
    HObject object() const { return object_; }
    bool hasObj(const HObject& object) const { return object.hasFn(type()); }

protected:
    HFnBase() = default;
    HFnBase(const HFnBase&) = default;
    HFnBase& operator=(const HFnBase&) = default;
    HObject object_;
};
