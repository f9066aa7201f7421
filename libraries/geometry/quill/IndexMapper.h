// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace quill {

/// Marks "no such index" wherever an index is stored.
inline constexpr std::uint32_t missingIndex = 0xFFFFFFFF;

/// Maps between the vertex indices of a full mesh and the affected indices, the positions of vertices in the list of
/// those that a deformer affects. Every per-vertex array of this library is in affected index space.
class IndexMapper {
public:
    /// Nothing affected of an empty mesh.
    IndexMapper() = default;

    /// Every vertex of a mesh of fullCount vertices is affected, in mesh order.
    void setIdentity(std::size_t fullCount);

    /// The vertices affectedToFull[k] of a mesh of fullCount vertices are affected, in that order. The list is taken
    /// over and need not ascend. Hostile lists are safe: an entry not below fullCount keeps its affected index, which
    /// no full index maps to; of a vertex listed twice, the later place counts.
    void set(std::vector<std::uint32_t> affectedToFull, std::size_t fullCount);

    bool isIdentity() const { return identity_; }
    std::size_t fullCount() const { return fullCount_; }
    std::size_t affectCount() const { return identity_ ? fullCount_ : affectedToFull_.size(); }

    /// Empty when isIdentity().
    const std::vector<std::uint32_t>& affectedToFull() const { return affectedToFull_; }
    /// The reverse table of fullCount entries; empty for an identity and until toAffected() first needed it.
    const std::vector<std::uint32_t>& fullToAffected() const { return fullToAffected_; }

    /// The full index of affected index k, k < affectCount().
    std::uint32_t toFull(std::size_t k) const { return identity_ ? static_cast<std::uint32_t>(k) : affectedToFull_[k]; }

    /// The affected index of a full index; missingIndex when the vertex is not affected, or not below fullCount. The
    /// first call after set() may build the reverse table (fullCount entries; std::bad_alloc when that fails), so it
    /// must not be made from two threads at once; later calls may.
    std::uint32_t toAffected(std::uint32_t fullIndex) const {
        if (fullIndex == missingIndex || fullIndex >= fullCount_)
            return missingIndex;
        if (identity_)
            return fullIndex;
        if (fullToAffected_.empty())
            buildFullToAffected();
        return fullToAffected_[fullIndex];
    }

private:
    void buildFullToAffected() const;

    bool identity_ = false;
    std::size_t fullCount_ = 0;
    std::vector<std::uint32_t> affectedToFull_;
    mutable std::vector<std::uint32_t> fullToAffected_;
};

} // namespace quill
