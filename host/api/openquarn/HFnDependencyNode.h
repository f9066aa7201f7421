// SPDX-License-Identifier: Apache-2.0
// Nodes, as seen from outside.
#pragma once

#include "openquarn/HFnBase.h"
#include "openquarn/HPlug.h"
#include "openquarn/HString.h"
#include "openquarn/HTypeId.h"

#include <vector>

class HPxNode;

/// The operations of a node.
class OPENQUARN_API HFnDependencyNode : public HFnBase {
public:
    HFnDependencyNode() = default;
    /// `node` a node. Fails as setObject() does. [any]
    explicit HFnDependencyNode(const HObject& node, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kDependencyNode; }

    /// Makes a node of a registered type and attaches the set to it. `name` "" for the type's name and a number; when
    /// it is taken, a number is added. Null on failure. [main]
    HObject create(const HString& typeName, const HString& name = HString(), HStatus* status = nullptr);
    HObject create(const HTypeId& type, const HString& name = HString(), HStatus* status = nullptr);

    HString name() const; ///< "" when nothing is attached. [any]
    /// Fails when the name is taken or cannot name a node. [main]
    HStatus setName(const HString& name);
    HString typeName() const; ///< [any]
    HTypeId typeId() const;   ///< 0 when nothing is attached. [any]
    /// The plug-in's object, owned by the host until the node is deleted; null for the host's own types. [any]
    HPxNode* userNode(HStatus* status = nullptr) const;

    /// The attribute with that long or short name, at any depth; null, and a failure, when there is none. [any]
    HObject attribute(const HString& name, HStatus* status = nullptr) const;
    unsigned attributeCount() const; ///< Top-level ones. [any]
    HObject attribute(unsigned index, HStatus* status = nullptr) const;
    /// The plug of an attribute by name; below an array, no element is chosen. Null, and a failure, without one. [any]
    HPlug findPlug(const HString& name, HStatus* status = nullptr) const;
    HPlug findPlug(const HObject& attribute, HStatus* status = nullptr) const;
    /// All plugs of the node that a connection begins or ends at, in order of attributes; `plugs` is replaced. [main]
    HStatus getConnections(HPlugArray& plugs) const;
};
