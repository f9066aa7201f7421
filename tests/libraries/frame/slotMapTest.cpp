// SPDX-License-Identifier: Apache-2.0
#include "frame/SlotMap.h"

#include <gmock/gmock.h>

#include <optional>

namespace {

using Indices = std::vector<std::uint32_t>;
constexpr std::uint32_t none = quill::missingIndex;

quill::IndexMapper mapOf(const std::optional<Indices>& vertices) {
    quill::IndexMapper map;
    if (vertices)
        map.set(*vertices, 6);
    else
        map.setIdentity(6);
    return map;
}

TEST(SlotMap, IsBuiltFromTheVerticesOfModelAndGeometry) {
    const Indices odd{1, 3, 5}, all{0, 1, 2, 3, 4, 5};
    const std::optional<Indices> complete;
    struct Row {
        const char* name;
        std::optional<Indices> deformed, trained; ///< none: all six
        bool isIdentity;
        Indices slots, vertices;
        std::size_t slotCount; ///< how many the network has to give
    };
    const Row rows[] = {
        {"all and complete", complete, complete, true, {}, {}, 6},
        {"all, said as a list", complete, all, true, {}, {}, 6},
        {"complete, said as a list", all, complete, true, {}, {}, 6},
        {"the same list", odd, odd, true, {}, {}, 3},
        {"nothing on nothing", Indices(), Indices(), true, {}, {}, 0},
        {"another order", odd, Indices{5, 3, 1}, false, {2, 1, 0}, {0, 1, 2}, 3},
        {"complete on a part", odd, complete, false, {1, 3, 5}, {0, 1, 2}, 6},
        {"a part on all", complete, Indices{4, 2}, false, {none, none, 1, none, 0, none}, {2, 4}, 2},
        {"overlapping", odd, Indices{3, 0, 2, 4}, false, {none, 0, none}, {1}, 1},
        {"outside", odd, Indices{0, 2, 4}, false, {}, {}, 0},
        {"beyond the full count", odd, Indices{1, 3, 9, 0xFFFFFFFF}, false, {0, 1, none}, {0, 1}, 2},
        {"nothing but hostile", odd, Indices{9, 0xFFFFFFFE}, false, {}, {}, 0},
        {"twice: the later counts", odd, Indices{3, 1, 3}, false, {1, 2, none}, {0, 1}, 3},
        {"no vertices", odd, Indices(), false, {}, {}, 0},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        const neuralWarp::SlotMap map = neuralWarp::mapSlots(mapOf(row.trained), mapOf(row.deformed));
        EXPECT_EQ(map.isIdentity, row.isIdentity);
        EXPECT_EQ(map.slots, row.slots);
        EXPECT_EQ(map.vertices, row.vertices);
        EXPECT_EQ(map.slotCount, row.slotCount);
        const neuralWarp::DrivenVertices driven(map.vertices, map.slots);
        for (std::size_t i = 0; i < 7 && !row.isIdentity; ++i)
            EXPECT_EQ(driven.contains(i), i < row.slots.size() && row.slots[i] != none) << i;
    }
}

} // namespace
