// SPDX-License-Identifier: Apache-2.0
// Which vertices of a geometry a deformer works on.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HUintArray.h"

#include <memory>

namespace OpenQuarn {
struct IndexMap;
} // namespace OpenQuarn

/// The affected vertices, in the order in which the deformer's iterator visits them. Fixed once made, cheap to copy. A
/// default-constructed one is the identity on no vertices. [any] throughout.
class OPENQUARN_API HIndexMapper {
public:
    HIndexMapper() = default;
    /// Number of affected vertices; fullCount() for an identity map.
    unsigned affectCount() const;
    /// Number of vertices of the whole geometry.
    unsigned fullCount() const;
    /// For each affected vertex, in order, its index in the whole geometry: affectCount() values below fullCount(),
    /// none twice. Empty for an identity map. Valid as long as this or a copy of it exists.
    const HUintArray& affectMap() const;
    /// True when all vertices are affected, in the order of the geometry.
    bool isIdentityMap() const;

private:
    friend class OpenQuarn::Access;
    explicit HIndexMapper(std::shared_ptr<const OpenQuarn::IndexMap> impl);
    std::shared_ptr<const OpenQuarn::IndexMap> impl_;
};
