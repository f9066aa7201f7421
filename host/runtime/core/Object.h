// SPDX-License-Identifier: Apache-2.0
// What a handle of the API stands for, and the one way from handles to the runtime's objects and back.
#pragma once

#include "openquarn/HObject.h"

#include <memory>
#include <utility>

namespace OpenQuarn {

/// Base of everything an HObject can hold: nodes, attributes, data, plug-ins, published buffers.
class Object : public std::enable_shared_from_this<Object> {
public:
    virtual ~Object() = default;
    Object(const Object&) = delete;
    Object& operator=(const Object&) = delete;

    /// Most specific kind.
    virtual HFn::Type kind() const = 0;
    /// True when a function set of that kind works on this.
    virtual bool isKind(HFn::Type type) const { return type == kind(); }
    /// False once the host has taken the object away although handles on it remain.
    virtual bool isAlive() const { return true; }

protected:
    Object() = default;
};

/// Friend of the API's handles. Handles that need a runtime object privately name this class as their friend and are
/// made and opened here; each family adds its functions in a header of its own (`class Access` has no state).
class Access {
public:
    static HObject object(std::shared_ptr<Object> object) { return HObject(std::move(object)); }
    static const std::shared_ptr<Object>& pointer(const HObject& object) { return object.object_; }

    /// The object as a T, or null: none, gone, or of another class.
    template <class T>
    static std::shared_ptr<T> as(const HObject& object) {
        const std::shared_ptr<Object>& held = object.object_;
        return held && held->isAlive() ? std::dynamic_pointer_cast<T>(held) : nullptr;
    }

    /// Reads or makes the private part of a handle class H, which declares `friend class OpenQuarn::Access` and keeps
    /// it in a member named `impl_` with a constructor from its type.
    template <class H>
    static auto& impl(H& handle) {
        return handle.impl_;
    }
    template <class H>
    static void setContext(H& handle, double time) {
        handle.normal_ = false;
        handle.time_ = time;
    }
    template <class H, class Impl>
    static H make(Impl&& impl) {
        return H(std::forward<Impl>(impl));
    }
};

} // namespace OpenQuarn
