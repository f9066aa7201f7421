// SPDX-License-Identifier: Apache-2.0
// Which vertices a model drives, and from which of its slots.
#pragma once

#include "quill/IndexMapper.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace neuralWarp {

/// From the deformed vertices to the slots of a model, which are the places of its vertices in the order in which it
/// was trained. A slot is three outputs of the network, or one row of each principal shape.
struct SlotMap {
    /// Slot k drives vertex k, for every deformed vertex; the lists are then empty.
    bool isIdentity = true;
    /// [deformed vertices] the slot that drives each, or quill::missingIndex. Empty when none drives any.
    std::vector<std::uint32_t> slots;
    /// The driven vertices, ascending.
    std::vector<std::uint32_t> vertices;
    /// The highest slot in use + 1.
    std::size_t slotCount = 0;
};

/// Compares the vertices of a model with those that are deformed. Both maps are of the same mesh; entries that are not
/// below the full count are nobody's vertex. Builds the reverse table of `trained`. Throws std::bad_alloc. [any]
SlotMap mapSlots(const quill::IndexMapper& trained, const quill::IndexMapper& deformed);

/// The driven vertices in their order, as loops take them: the k-th is vertex(k), from slot slot(k). Nothing is owned.
struct DrivenVertices {
    /// All of `vertexCount`, each from the slot of its own number.
    explicit DrivenVertices(std::size_t vertexCount)
        : count(vertexCount) {}
    /// Those of a SlotMap that is no identity: `list` its vertices, `map` its slots. Both outlive this.
    DrivenVertices(const std::vector<std::uint32_t>& list, const std::vector<std::uint32_t>& map)
        : count(list.size())
        , vertices(&list)
        , slots(&map) {}

    std::size_t vertex(std::size_t k) const { return vertices ? (*vertices)[k] : k; }
    // without slots there are no vertices either: "k" is as right, and sums of shapes then take a third longer
    std::size_t slot(std::size_t k) const { return slots ? (*slots)[vertex(k)] : vertex(k); }
    /// Vertex i is among them. False for an index that no vertex has, unless all are driven.
    bool contains(std::size_t i) const { return !slots || (i < slots->size() && (*slots)[i] != quill::missingIndex); }

    std::size_t count = 0;
    const std::vector<std::uint32_t>* vertices = nullptr; ///< null: all
    const std::vector<std::uint32_t>* slots = nullptr;    ///< null: each its own
};

} // namespace neuralWarp
