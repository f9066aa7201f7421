// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HString.h"

namespace OpenQuarn {

/// What a node publishes under a name for one of its geometries (HPxDeformerNode::getNamedBuffer); null when that is
/// nothing, or the node is none, and when it throws. Thread: one that evaluates.
HObject publishedBuffer(const HObject& dependencyNode, const HString& name, unsigned multiIndex);

} // namespace OpenQuarn
