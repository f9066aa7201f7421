// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/replacedSkins.h"

#include "quarn/scene/plugs.h"

namespace quarn {
namespace {

constexpr const char* replaced = "replacedMesh";

bool isCache(const HPlug& plug) {
    return !plug.isNull() && nodeType(plug.node()) == "pointCache";
}

} // namespace

HPlug skinReplacedBy(const HPlug& geometry) {
    return isCache(geometry) ? sourceOf(geometry.node(), replaced) : HPlug();
}

HPlug replacementAt(const HPlug& destination) {
    return isCache(destination) && destination == plugOf(destination.node(), replaced)
               ? plugOf(destination.node(), "outMesh")
               : HPlug();
}

} // namespace quarn
