// SPDX-License-Identifier: Apache-2.0
// Geometry of any kind: a mesh is the only one there is.
#pragma once

#include "openquarn/HFnBase.h"
#include "openquarn/HString.h"
#include "openquarn/HStringArray.h"
#include "openquarn/HUintArray.h"

/// What every piece of geometry has: vertices, and component tags, which are named lists of vertices in an order of
/// their own. Data is a value: it never changes. A call that changes something attaches the set to a new piece of data,
/// which object() gives and which shares everything else with the one before.
class OPENQUARN_API HFnGeometryData : public HFnBase {
public:
    HFnGeometryData() = default;
    /// `data` a mesh. Fails as setObject() does. [any]
    explicit HFnGeometryData(const HObject& data, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kMeshData; }

    /// 0 when nothing is attached. [any]
    unsigned vertexCount() const;

    /// Names of the component tags, sorted; `names` is replaced. Fails when nothing is attached. [any]
    HStatus getComponentTags(HStringArray& names) const;
    /// The vertices of a component tag, in the order in which they were given; `vertices` is replaced. Fails with
    /// kFailure when there is no such tag. [any]
    HStatus getComponentTag(const HString& name, HUintArray& vertices) const;
    /// Gives the geometry a component tag, in place of one of the same name.
    /// `name` a letter or "_", then letters, digits and "_". `vertices` each below vertexCount(), none twice, in any
    /// order; copied. Fails with kInvalidParameter, naming the value, otherwise. [any]
    HStatus setComponentTag(const HString& name, const HUintArray& vertices);
    /// Fails with kFailure when there is no such tag. [any]
    HStatus removeComponentTag(const HString& name);
};
