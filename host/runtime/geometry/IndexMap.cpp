// SPDX-License-Identifier: Apache-2.0
#include "geometry/IndexMap.h"

#include "core/Object.h"

namespace OpenQuarn {
namespace {

bool listsAllInOrder(const HUintArray& vertices, unsigned vertexCount) {
    if (vertices.length() != vertexCount)
        return false;
    for (unsigned i = 0; i < vertexCount; ++i)
        if (vertices[i] != i)
            return false;
    return true;
}

} // namespace

bool IndexMap::operator==(const IndexMap& other) const {
    if (fullCount != other.fullCount || isIdentity() != other.isIdentity())
        return false;
    return affected == other.affected || *affected == *other.affected;
}

std::shared_ptr<const IndexMap> resolveExpression(const MeshData& mesh, const std::string& expression) {
    const auto map = std::make_shared<IndexMap>();
    map->fullCount = mesh.vertexCount();
    if (expression.empty() || expression == "*")
        return map;
    const std::shared_ptr<const HUintArray> vertices = mesh.tag(expression);
    if (!vertices)
        return nullptr;
    if (!listsAllInOrder(*vertices, map->fullCount))
        map->affected = vertices;
    return map;
}

} // namespace OpenQuarn

HIndexMapper::HIndexMapper(std::shared_ptr<const OpenQuarn::IndexMap> impl)
    : impl_(std::move(impl)) {}

unsigned HIndexMapper::affectCount() const {
    return impl_ ? impl_->affectCount() : 0U;
}
unsigned HIndexMapper::fullCount() const {
    return impl_ ? impl_->fullCount : 0U;
}
const HUintArray& HIndexMapper::affectMap() const {
    static const HUintArray none;
    return impl_ && impl_->affected ? *impl_->affected : none;
}
bool HIndexMapper::isIdentityMap() const {
    return !impl_ || impl_->isIdentity();
}
