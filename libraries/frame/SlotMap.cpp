// SPDX-License-Identifier: Apache-2.0
#include "frame/SlotMap.h"

#include <algorithm>

namespace neuralWarp {
namespace {

bool sameVertices(const quill::IndexMapper& a, const quill::IndexMapper& b) {
    if (a.affectCount() != b.affectCount())
        return false;
    if (a.isIdentity() && b.isIdentity())
        return true;
    for (std::size_t k = 0; k < a.affectCount(); ++k)
        if (a.toFull(k) != b.toFull(k))
            return false;
    return true;
}

} // namespace

SlotMap mapSlots(const quill::IndexMapper& trained, const quill::IndexMapper& deformed) {
    SlotMap map;
    map.isIdentity = sameVertices(trained, deformed);
    if (map.isIdentity) {
        map.slotCount = deformed.affectCount();
        return map;
    }
    map.slots.resize(deformed.affectCount());
    for (std::size_t k = 0; k < map.slots.size(); ++k) {
        const std::uint32_t slot = trained.toAffected(deformed.toFull(k));
        map.slots[k] = slot;
        if (slot != quill::missingIndex) {
            map.vertices.push_back(static_cast<std::uint32_t>(k));
            map.slotCount = std::max<std::size_t>(map.slotCount, std::size_t{slot} + 1);
        }
    }
    if (map.vertices.empty())
        map.slots.clear();
    return map;
}

} // namespace neuralWarp
