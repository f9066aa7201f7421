// SPDX-License-Identifier: Apache-2.0
// The handle on anything that the host owns.
#pragma once

#include "openquarn/HApi.h"

#include <memory>

/// Kinds of objects, and of the function sets that work on them.
class OPENQUARN_API HFn {
public:
    enum Type : int {
        kInvalid = 0, ///< No object, or one that has gone.
        kPlugin,
        kDependencyNode, ///< Any node; the kinds below count as it too.
        kPluginNode,     ///< A node whose type a plug-in registered.
        kGeometryFilter, ///< A node that deforms geometry.
        kMeshNode,       ///< A node that holds a mesh.
        kTimeNode,
        kAttribute, ///< Any attribute; the kinds below count as it too.
        kNumericAttribute,
        kTypedAttribute,
        kEnumAttribute,
        kCompoundAttribute,
        kMessageAttribute,
        kMatrixAttribute,
        kData, ///< Any data; the kinds below count as it too.
        kStringData,
        kMatrixData,
        kDoubleArrayData,
        kMeshData,
        kPluginData,
        kArrayObject, ///< A published buffer (TapiCastAnim).
    };
};

/// A node, an attribute, a piece of data, a plug-in: copyable, cheap, and null when default-constructed. Two handles
/// are equal when they stand for the same object. Holding one keeps an attribute or a piece of data alive, but not a
/// node: the handle of a deleted node becomes null. `[any]`
class OPENQUARN_API HObject {
public:
    HObject() noexcept = default;

    /// True for no object, and for one that has gone.
    bool isNull() const noexcept;
    /// The most specific kind; kInvalid when null.
    HFn::Type apiType() const noexcept;
    /// True when a function set of this kind works on the object.
    bool hasFn(HFn::Type type) const noexcept;
    bool operator==(const HObject& other) const noexcept { return object_ == other.object_; }
    bool operator!=(const HObject& other) const noexcept { return object_ != other.object_; }

    static const HObject kNullObj;

private:
    friend class OpenQuarn::Access;
    explicit HObject(std::shared_ptr<OpenQuarn::Object> object) noexcept;
    std::shared_ptr<OpenQuarn::Object> object_;
};
