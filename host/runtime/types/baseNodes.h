// SPDX-License-Identifier: Apache-2.0
// The host's own node types.
#pragma once

#include "types/NodeClass.h"

namespace OpenQuarn {

/// Registers the host's node types, once a process.
void registerBaseNodes();

/// "message", which every node has.
std::shared_ptr<Attribute> messageAttribute();

/// "dependNode": what every node has. Cannot be created by itself.
std::shared_ptr<const NodeClass> dependClass();
/// "time": its output "outTime" is the scene's current time in frames. Each scene has one node of it, "time1".
std::shared_ptr<const NodeClass> timeClass();
unsigned timeOutPosition();

/// The class that a kind of plug-in node begins with: its attributes and what depends on what.
std::shared_ptr<const NodeClass> baseClassOf(HPxNode::Type type);
bool hasBaseClass(HPxNode::Type type);
/// For the families that bring such a class.
void setBaseClass(HPxNode::Type type, std::shared_ptr<const NodeClass> base);
/// The kind that nodes of such a type have.
HFn::Type objectKindOf(HPxNode::Type type);

/// Makes a type from a base, an initializer (may be null) and a creator. Throws std::runtime_error with the
/// initializer's status, and std::invalid_argument as addNodeClass() does. It is not registered yet.
std::shared_ptr<NodeClass> buildNodeClass(const std::string& name, HTypeId id, HPxNode::Type type,
                                          NodeClass::Creator creator, HStatus (*initializer)());

} // namespace OpenQuarn
