// SPDX-License-Identifier: Apache-2.0
#include "frame/PrincipalBasis.h"

#include "half.h"
#include "quill/largePages.h"
#include "quill/parallelFor.h"
#include "sumShapes.h"

#include <algorithm>
#include <array>
#include <utility>

namespace neuralWarp {

template <class Number>
void PrincipalBasis::makeRoom(std::vector<Number>& numbers, std::size_t slotCount, std::size_t shapeCount) {
    clear();
    if (slotCount == 0 || shapeCount == 0)
        return;
    quill::resizeInLargePages(numbers, (slotCount + lanes - 1) / lanes * shapeCount * 3 * lanes);
    shapeCount_ = shapeCount;
    slotCount_ = slotCount;
}

template <class Number>
void PrincipalBasis::put(std::vector<Number>& numbers, std::size_t first, std::span<const Number> values) {
    const std::size_t end = first + values.size() / (3 * shapeCount_);
    for (std::size_t b = first / lanes; b * lanes < end; ++b) {
        const std::size_t slot = std::max(first, b * lanes);
        const std::size_t count = std::min(end, (b + 1) * lanes) - slot;
        const Number* const in = values.data() + (slot - first) * 3 * shapeCount_;
        Number* out = numbers.data() + b * shapeCount_ * 3 * lanes;
        out += slot % lanes;
        for (std::size_t i = 0; i < 3 * shapeCount_; ++i, out += lanes)
            for (std::size_t lane = 0; lane < count; ++lane)
                out[lane] = in[3 * shapeCount_ * lane + i];
    }
}

void PrincipalBasis::resize(std::size_t slotCount, std::size_t shapeCount) {
    makeRoom(values_, slotCount, shapeCount);
}

void PrincipalBasis::resizeHalves(std::size_t slotCount, std::span<const float> scales) {
    std::vector<float> kept(scales.begin(), scales.end());
    makeRoom(halves_, slotCount, scales.size());
    scales_ = std::move(kept);
}

void PrincipalBasis::set(std::size_t first, std::span<const float> values) {
    put(values_, first, values);
}

void PrincipalBasis::set(std::size_t first, std::span<const std::uint16_t> halves) {
    put(halves_, first, halves);
}

void PrincipalBasis::assign(const std::vector<float>& values, std::uint64_t shapeCount) {
    const auto shapes = static_cast<std::size_t>(shapeCount);
    resize(shapes == 0 ? 0 : values.size() / 3 / shapes, shapes);
    quill::parallelFor(blockCount(), [&](std::size_t b) {
        const std::size_t first = lanes * b;
        const std::size_t count = std::min(lanes, slotCount_ - first);
        set(first, std::span(values).subspan(3 * shapes * first, 3 * shapes * count));
    });
    share();
}

void PrincipalBasis::share() {
    if (values_.empty() && halves_.empty())
        return;
    quill::SharedArray<float> floats(std::move(values_));
    sharedHalves_ = std::move(halves_);
    sharedValues_ = std::move(floats);
    values_ = {};
    halves_ = {};
}

std::vector<float> PrincipalBasis::slotMajor() const {
    std::vector<float> values(3 * shapeCount_ * slotCount_);
    quill::parallelFor(slotCount_, [&](std::size_t slot) {
        const std::size_t first = slot / lanes * shapeCount_ * 3 * lanes + slot % lanes;
        for (std::size_t i = 0; i < 3 * shapeCount_; ++i) {
            const std::size_t place = first + i * lanes;
            values[3 * shapeCount_ * slot + i] =
                hasHalves() ? scales_[i / 3] * decodeHalf(halfBlocks()[place]) : floatBlocks()[place];
        }
    });
    return values;
}

void PrincipalBasis::sumBlock(float* components, const float* coefficients, std::size_t block) const {
    const std::size_t first = block * shapeCount_ * 3 * lanes;
    if (hasHalves())
        sumHalfShapes(quill::instructionSet())(components, halfBlocks() + first, scales_.data(), coefficients,
                                               shapeCount_);
    else
        sumShapes(quill::instructionSet())(components, floatBlocks() + first, coefficients, shapeCount_);
}

void PrincipalBasis::sum(quill::val3<float>* sums, const float* coefficients, std::size_t begin,
                         std::size_t end) const {
    std::array<float, 3 * lanes> components; // [3][lanes]
    for (std::size_t b = begin; b < end; ++b) {
        sumBlock(components.data(), coefficients, b);
        const std::size_t first = lanes * b;
        const std::size_t count = std::min(lanes, slotCount_ - first);
        for (std::size_t lane = 0; lane < count; ++lane)
            sums[first + lane] = {components[lane], components[lanes + lane], components[2 * lanes + lane]};
    }
}

} // namespace neuralWarp
