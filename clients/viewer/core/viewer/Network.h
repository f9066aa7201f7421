// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "frame/Network.h"

namespace viewer {

/// What an operation computes: from a vector a and constants, from vectors a and b, or from a alone, value by value but
/// for the first. Vectors and lists of constants have the length of the result, or 1 value that counts for all.
enum class Operation : std::uint32_t {
    matrixProduct = 1, ///< a times the constants, [length of a][length of the result], row-major
    addConstants = 2,
    subtractConstants = 3,
    multiplyConstants = 4,
    add = 5,
    subtract = 6, ///< a - b
    multiply = 7,
    clip = 8,      ///< at least the first half of the constants, at most the second; an infinite one bounds nothing
    leakyRelu = 9, ///< below 0, times the parameter
    relu = 10,
    tanh = 11,
    sigmoid = 12,
    subtractFromConstants = 13,
};

/// Where an operation has no second vector.
inline constexpr std::uint32_t noVector = 0xFFFFFFFF;

/// Values that all vectors of a network may have together.
inline constexpr std::size_t networkValueLimit = std::size_t{1} << 27;

/// A network as operations on vectors that have numbers for names, and the constants that those take: what `quarn view`
/// writes into a page. Computes in float, each sum in ascending order and nothing fused, so that all builds give the
/// same bits.
///
/// words: [0] version 1, [1] number of vectors V, [2] controls, [3] outputs, [4] number of operations, [5] the vector
/// of the outputs; the length of each vector [V], of which vector 0 is the controls; then of each operation, in order,
///   kind, a, b, result, offset of its constants, count of them, parameter (the bits of a float)
/// where each vector but 0 is the result of one operation, before those that take it.
///
/// Thread: one at a time for one object.
class Network final : public neuralWarp::Network {
public:
    /// Copies the constants. Neither argument is trusted: throws std::runtime_error when they do not fit, which names
    /// the operation by its number from 0.
    Network(std::span<const std::uint32_t> words, std::span<const float> constants);

    std::size_t inputCount() const { return vectors_.front().count; }
    std::size_t outputCount() const { return vectors_[output_].count; }

    /// Empty when there are fewer controls than inputCount(), or one of them is not finite. Allocates the answer and
    /// nothing else.
    std::vector<float> run(std::span<const float> controls) override;

private:
    /// A stretch of `values_`.
    struct Vector {
        std::size_t begin = 0;
        std::size_t count = 0;
        bool isSet = false; ///< while the words are checked: some operation before gives it
    };
    struct Step {
        Operation kind;
        std::uint32_t a;
        std::uint32_t b;
        std::uint32_t result;
        std::uint32_t firstConstant;
        std::uint32_t constantCount;
        float parameter;
    };

    void setVectors(std::span<const std::uint32_t> counts);
    void addStep(std::span<const std::uint32_t> words);
    bool fits(const Step& step) const;
    std::span<float> valuesOf(std::uint32_t vector);
    void compute(const Step& step);

    std::vector<Vector> vectors_;
    std::vector<Step> steps_;
    std::uint32_t output_ = 0;
    std::vector<float> constants_;
    std::vector<float> values_;
};

} // namespace viewer
