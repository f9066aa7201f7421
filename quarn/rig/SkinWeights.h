// SPDX-License-Identifier: Apache-2.0
// Which joints move each vertex of a geometry, and by how much.
#pragma once

#include "openquarn/HStatus.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace rig {

/// One joint's share of one vertex.
struct Influence {
    double weight = 0.0;
    std::uint32_t joint = 0; ///< position in SkinWeights::joints
};

/// The influences of every vertex, one vertex after the other. Shares of 0 are left out.
struct SkinWeights {
    std::vector<std::uint32_t> first;  ///< [vertices + 1]: vertex v has influences first[v] to first[v + 1] - 1
    std::vector<Influence> influences; ///< [first.back()], in the order they were given
    std::vector<std::uint32_t> joints; ///< logical indices of the joints that are used, ascending, none twice

    std::size_t vertexCount() const { return first.empty() ? 0 : first.size() - 1; }
};

/// The lists as a scene has them: not trusted.
struct SkinLists {
    const std::vector<double>& counts;     ///< [vertices] number of influences
    const std::vector<double>& influences; ///< [sum of counts] logical index of the joint
    const std::vector<double>& weights;    ///< [sum of counts]
};

/// Checks the lists and makes `skin` of them. With `normalize` the weights of a vertex are divided by their sum, unless
/// that is 0. Fails, and leaves `skin` alone, naming list, position and value: a count or an index that is no whole
/// number from 0 to 2^32 - 1, a weight that is not finite, a sum of weights that is not finite, lists that are not as
/// long as the counts say. Takes memory by the length of the lists, whatever they hold; throws std::bad_alloc. [any]
HStatus makeSkinWeights(const SkinLists& lists, bool normalize, SkinWeights& skin);

} // namespace rig
