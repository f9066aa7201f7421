// SPDX-License-Identifier: Apache-2.0
// The principal shapes of a model, laid out for the sum of them that every frame makes.
#pragma once

#include "frame/Points.h"
#include "quill/SharedArray.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace neuralWarp {

/// Sixteen slots side by side, whose shapes follow each other: a sum then reads the basis once, from its beginning to
/// its end, as fast as the memory gives it (decision 0183). Numbers are floats, or halves with a scale for each shape,
/// which stand for the floats scale * number, rounded to single precision. Const members may run at the same time.
class PrincipalBasis {
public:
    /// Slots of a block.
    static constexpr std::size_t lanes = 16;

    /// Takes over a basis.
    ///   values      [slots][shapeCount][3], as files and devices have it; what is left over of a slot is left out
    ///   shapeCount  0: there is no basis
    /// Throws std::bad_alloc; the basis is then empty.
    void assign(const std::vector<float>& values, std::uint64_t shapeCount);
    /// Makes room for a basis, all of it 0; for none when one of the counts is. Throws std::bad_alloc; the basis is
    /// then empty.
    void resize(std::size_t slotCount, std::size_t shapeCount);
    /// The same for halves. `scales` [shapes], finite, and small enough for scale * 65504 to be.
    void resizeHalves(std::size_t slotCount, std::span<const float> scales);
    /// Sets slots from `first` on: `values` [n][shapeCount()][3], no more than there is room for; floats behind
    /// resize(), finite halves (IEEE 754 binary16) behind resizeHalves().
    void set(std::size_t first, std::span<const float> values);
    void set(std::size_t first, std::span<const std::uint16_t> halves);
    /// All slots are set: from now on it is held once with all bases of the same values. Throws std::bad_alloc.
    void share();
    /// Whether it is held once with another. [any]
    bool isSharedWith(const PrincipalBasis& other) const {
        return shapeCount_ != 0 && floatBlocks() == other.floatBlocks() && halfBlocks() == other.halfBlocks();
    }
    void clear() { *this = {}; }

    std::size_t shapeCount() const { return shapeCount_; }
    std::size_t slotCount() const { return slotCount_; }
    std::size_t blockCount() const { return (slotCount_ + lanes - 1) / lanes; }
    bool hasHalves() const { return !halves_.empty() || !sharedHalves_.empty(); }
    /// Size in bytes.
    std::size_t bytes() const {
        return (values_.capacity() + sharedValues_.capacity() + scales_.capacity()) * sizeof(float) +
               (halves_.capacity() + sharedHalves_.capacity()) * sizeof(std::uint16_t);
    }
    /// [slotCount()][shapeCount()][3] again, as floats.
    std::vector<float> slotMajor() const;

    /// sums[s] = the sum over all shapes j of coefficients[j] * shape j of slot s, in single precision and increasing
    /// j, for the slots of the blocks begin .. end - 1, up to slotCount(). The same bits with every instruction set,
    /// and with halves those of the floats that they stand for.
    ///   sums          [slotCount()]
    ///   coefficients  [shapeCount()]: not checked
    void sum(quill::val3<float>* sums, const float* coefficients, std::size_t begin, std::size_t end) const;

private:
    template <class Number>
    void makeRoom(std::vector<Number>& numbers, std::size_t slotCount, std::size_t shapeCount);
    template <class Number>
    void put(std::vector<Number>& numbers, std::size_t first, std::span<const Number> values);
    void sumBlock(float* components, const float* coefficients, std::size_t block) const;

    const float* floatBlocks() const { return sharedValues_.empty() ? values_.data() : sharedValues_.data(); }
    const std::uint16_t* halfBlocks() const { return sharedHalves_.empty() ? halves_.data() : sharedHalves_.data(); }

    std::size_t shapeCount_ = 0, slotCount_ = 0;
    // [blocks][shapes][3][lanes], zero beyond the last slot: one of the two, while it is filled, and from then on
    std::vector<float> values_;
    std::vector<std::uint16_t> halves_;
    quill::SharedArray<float> sharedValues_;
    quill::SharedArray<std::uint16_t> sharedHalves_;
    std::vector<float> scales_; // [shapes], of halves
};

} // namespace neuralWarp
