// SPDX-License-Identifier: Apache-2.0
// The vertices that a deformer affects.
#pragma once

#include "geometry/MeshData.h"
#include "openquarn/HIndexMapper.h"

namespace OpenQuarn {

struct IndexMap {
    unsigned fullCount = 0;
    std::shared_ptr<const HUintArray> affected; ///< null: all, in order

    bool isIdentity() const { return affected == nullptr; }
    unsigned affectCount() const { return affected ? affected->length() : fullCount; }
    unsigned fullIndex(unsigned position) const { return affected ? (*affected)[position] : position; }
    bool operator==(const IndexMap& other) const;
};

/// What an expression stands for on a mesh: "*" or "" for everything, else the name of a component tag. A tag that
/// lists all vertices in order is the identity. Null when there is no such tag.
std::shared_ptr<const IndexMap> resolveExpression(const MeshData& mesh, const std::string& expression);

} // namespace OpenQuarn
