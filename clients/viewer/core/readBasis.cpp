// SPDX-License-Identifier: Apache-2.0
#include "readBasis.h"

#include "checks.h"

#include <string>
#include <vector>

namespace viewer {
namespace {

constexpr const char* block = "basis.values";

template <class Number>
void unpack(const Blocks& blocks, std::span<const float> scales, neuralWarp::PrincipalBasis& basis) {
    const auto numbers = blocks.array<Number>(block);
    std::vector<float> row(3 * scales.size());
    for (std::size_t slot = 0; slot < basis.slotCount(); ++slot) {
        for (std::size_t i = 0; i < row.size(); ++i)
            row[i] = scales[i / 3] * static_cast<float>(numbers[row.size() * slot + i]);
        basis.set(slot, std::span<const float>(row));
    }
}

} // namespace

void readBasis(const Blocks& blocks, const Settings& settings, neuralWarp::PrincipalBasis& basis) {
    const std::uint64_t count = product({settings.slots, settings.shapes, 3});
    const std::size_t bytes = blocks.bytes(block).size();
    if (count == 0 || (bytes != count && bytes != product({2, count}) && bytes != product({4, count})))
        refuse(block, std::to_string(bytes) + " bytes are not 1, 2 or 4 for each of the " + std::to_string(count) +
                          " numbers of " + std::to_string(settings.shapes) + " shapes of " +
                          std::to_string(settings.slots) + " slots");
    basis.resize(settings.slots, settings.shapes);
    if (bytes == 4 * count)
        basis.set(0, blocks.array<float>(block));
    else if (const auto scales = arrayOf<float>(blocks, "basis.scales", settings.shapes); bytes == 2 * count)
        unpack<std::int16_t>(blocks, scales, basis);
    else
        unpack<std::int8_t>(blocks, scales, basis);
    basis.share();
}

} // namespace viewer
