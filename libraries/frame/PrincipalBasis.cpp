// SPDX-License-Identifier: Apache-2.0
#include "frame/PrincipalBasis.h"

#include "quill/largePages.h"
#include "quill/parallelFor.h"
#include "sumShapes.h"

#include <algorithm>
#include <array>

namespace neuralWarp {

void PrincipalBasis::assign(const std::vector<float>& values, std::uint64_t shapeCount) {
    clear();
    const std::size_t slots = shapeCount == 0 ? 0 : values.size() / 3 / static_cast<std::size_t>(shapeCount);
    if (slots == 0)
        return;
    const auto shapes = static_cast<std::size_t>(shapeCount);
    const std::size_t blocks = (slots + lanes - 1) / lanes;
    quill::resizeInLargePages(values_, blocks * shapes * 3 * lanes);
    quill::parallelFor(blocks, [&](std::size_t b) {
        float* out = values_.data() + b * shapes * 3 * lanes;
        const std::size_t count = std::min(lanes, slots - lanes * b);
        for (std::size_t j = 0; j < shapes; ++j)
            for (std::size_t axis = 0; axis < 3; ++axis, out += lanes)
                for (std::size_t lane = 0; lane < count; ++lane)
                    out[lane] = values[3 * (shapes * (lanes * b + lane) + j) + axis];
    });
    shapeCount_ = shapes;
    slotCount_ = slots;
}

std::vector<float> PrincipalBasis::slotMajor() const {
    std::vector<float> values(3 * shapeCount_ * slotCount_);
    quill::parallelFor(slotCount_, [&](std::size_t slot) {
        const float* const block = values_.data() + slot / lanes * shapeCount_ * 3 * lanes + slot % lanes;
        for (std::size_t i = 0; i < 3 * shapeCount_; ++i)
            values[3 * shapeCount_ * slot + i] = block[i * lanes];
    });
    return values;
}

void PrincipalBasis::sum(quill::val3<float>* sums, const float* coefficients, std::size_t begin,
                         std::size_t end) const {
    const SumShapes kernel = sumShapes(quill::instructionSet());
    std::array<float, 3 * lanes> components; // [3][lanes]
    for (std::size_t b = begin; b < end; ++b) {
        kernel(components.data(), values_.data() + b * shapeCount_ * 3 * lanes, coefficients, shapeCount_);
        const std::size_t first = lanes * b;
        const std::size_t count = std::min(lanes, slotCount_ - first);
        for (std::size_t lane = 0; lane < count; ++lane)
            sums[first + lane] = {components[lane], components[lanes + lane], components[2 * lanes + lane]};
    }
}

} // namespace neuralWarp
