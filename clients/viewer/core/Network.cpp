// SPDX-License-Identifier: Apache-2.0
#include "viewer/Network.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <functional>
#include <stdexcept>
#include <string>

#include "viewer/activations.h"

namespace viewer {
namespace {

constexpr std::size_t headWords = 6;
constexpr std::size_t stepWords = 7;
constexpr std::uint32_t knownVersion = 1;

[[noreturn]] void refuse(const std::string& reason) {
    throw std::runtime_error("the block \"network.words\" " + reason);
}

/// Adds `rows` rows of `w`, each times its value of `a`, to `sums`. Eight rows at a time are summed in pairs and then
/// added: that reads and writes the sums less often, and rounds them less often (N. Higham, "The Accuracy of Floating
/// Point Summation", SIAM J. Sci. Comput. 14, 1993). The order depends on nothing but the number of rows.
void addRows(const float* a, const float* w, std::size_t stride, std::size_t rows, std::span<float> sums) {
    float* const __restrict out = sums.data();
    const std::size_t count = sums.size();
    std::size_t k = 0;
    for (; k + 8 <= rows; k += 8, a += 8, w += 8 * stride) {
        const auto pair = [&](std::size_t row, std::size_t j) {
            return a[row] * w[row * stride + j] + a[row + 1] * w[(row + 1) * stride + j];
        };
        for (std::size_t j = 0; j < count; ++j)
            out[j] += (pair(0, j) + pair(2, j)) + (pair(4, j) + pair(6, j));
    }
    for (; k < rows; ++k, ++a, w += stride)
        for (std::size_t j = 0; j < count; ++j)
            out[j] += *a * w[j];
}

void multiplyMatrix(std::span<const float> a, const float* matrix, std::span<float> out) {
    constexpr std::size_t together = 2048; // sums that stay in the first cache
    std::fill(out.begin(), out.end(), 0.0F);
    for (std::size_t begin = 0; begin < out.size(); begin += together)
        addRows(a.data(), matrix + begin, out.size(), a.size(),
                out.subspan(begin, std::min(together, out.size() - begin)));
}

template <class Function>
void each(std::span<const float> a, std::span<float> out, Function function) {
    std::transform(a.begin(), a.end(), out.begin(), function);
}

/// function(a, b), value by value; one of the two may have 1 value for all.
template <class Function>
void pairs(std::span<const float> a, std::span<const float> b, std::span<float> out, Function function) {
    if (a.size() < out.size())
        return each(b, out, [&, first = a.front()](float value) { return function(first, value); });
    if (b.size() < out.size())
        return each(a, out, [&, second = b.front()](float value) { return function(value, second); });
    std::transform(a.begin(), a.end(), b.begin(), out.begin(), function);
}

bool hasSecondVector(Operation kind) {
    return kind == Operation::add || kind == Operation::subtract || kind == Operation::multiply;
}

bool isOneOr(std::size_t count, std::size_t length) {
    return count == 1 || count == length;
}

} // namespace

Network::Network(std::span<const std::uint32_t> words, std::span<const float> constants) {
    if (words.size() < headWords || words[0] != knownVersion)
        refuse("is of a version that is not known, or none at all");
    const std::uint64_t vectorCount = words[1];
    const std::uint64_t stepCount = words[4];
    if (words.size() != headWords + vectorCount + stepWords * stepCount || vectorCount == 0)
        refuse("has " + std::to_string(words.size()) + " words, and says others of " + std::to_string(vectorCount) +
               " vectors and " + std::to_string(stepCount) + " operations");
    setVectors(words.subspan(headWords, static_cast<std::size_t>(vectorCount)));
    constants_.assign(constants.begin(), constants.end());
    steps_.reserve(static_cast<std::size_t>(stepCount));
    for (std::size_t i = 0; i < stepCount; ++i)
        addStep(words.subspan(headWords + vectors_.size() + stepWords * i, stepWords));
    output_ = words[5];
    if (output_ >= vectors_.size() || !vectors_[output_].isSet || outputCount() != words[3] || inputCount() != words[2])
        refuse("has other numbers of controls or outputs than it says");
}

void Network::setVectors(std::span<const std::uint32_t> counts) {
    std::size_t begin = 0;
    vectors_.reserve(counts.size());
    for (const std::uint32_t count : counts) {
        if (count == 0 || count > networkValueLimit - begin)
            refuse("has a vector without values, or more than " + std::to_string(networkValueLimit) + " values");
        vectors_.push_back({begin, count});
        begin += count;
    }
    vectors_.front().isSet = true;
    values_.resize(begin);
}

void Network::addStep(std::span<const std::uint32_t> words) {
    const Step step{Operation{words[0]},           words[1], words[2], words[3], words[4], words[5],
                    std::bit_cast<float>(words[6])};
    const auto refuseStep = [&](const char* reason) {
        refuse("is damaged: operation " + std::to_string(steps_.size()) + ", of kind " + std::to_string(words[0]) +
               ", " + reason);
    };
    const auto isThere = [&](std::uint32_t vector) { return vector < vectors_.size() && vectors_[vector].isSet; };
    if (words[0] < static_cast<std::uint32_t>(Operation::matrixProduct) ||
        words[0] > static_cast<std::uint32_t>(Operation::subtractFromConstants))
        refuseStep("is none that is known");
    if (!isThere(step.a) || (hasSecondVector(step.kind) ? !isThere(step.b) : step.b != noVector))
        refuseStep("takes a vector that is not there yet");
    if (step.result >= vectors_.size() || vectors_[step.result].isSet)
        refuseStep("gives no vector, or one that is there");
    if (std::uint64_t{step.firstConstant} + step.constantCount > constants_.size())
        refuseStep("takes constants that are not there");
    if (!fits(step))
        refuseStep("takes vectors or constants of other lengths than it gives");
    vectors_[step.result].isSet = true;
    steps_.push_back(step);
}

bool Network::fits(const Step& step) const {
    const std::size_t a = vectors_[step.a].count;
    const std::size_t result = vectors_[step.result].count;
    switch (step.kind) {
    case Operation::matrixProduct:
        return std::uint64_t{a} * result == step.constantCount;
    case Operation::addConstants:
    case Operation::subtractConstants:
    case Operation::multiplyConstants:
    case Operation::subtractFromConstants:
        return std::max<std::size_t>(a, step.constantCount) == result && isOneOr(a, result) &&
               isOneOr(step.constantCount, result);
    case Operation::add:
    case Operation::subtract:
    case Operation::multiply:
        return step.constantCount == 0 && std::max(a, vectors_[step.b].count) == result && isOneOr(a, result) &&
               isOneOr(vectors_[step.b].count, result);
    case Operation::clip:
        return a == result && (step.constantCount == 2 || step.constantCount == 2 * std::uint64_t{result});
    default:
        return a == result && step.constantCount == 0;
    }
}

std::span<float> Network::valuesOf(std::uint32_t vector) {
    return {values_.data() + vectors_[vector].begin, vectors_[vector].count};
}

std::vector<float> Network::run(std::span<const float> controls) {
    if (controls.size() < inputCount())
        return {};
    controls = controls.first(inputCount());
    if (!std::all_of(controls.begin(), controls.end(), [](float value) { return std::isfinite(value); }))
        return {};
    std::copy(controls.begin(), controls.end(), values_.begin());
    for (const Step& step : steps_)
        compute(step);
    const std::span<const float> answer = valuesOf(output_);
    return {answer.begin(), answer.end()};
}

void Network::compute(const Step& step) {
    const std::span<const float> a = valuesOf(step.a);
    const std::span<const float> b = hasSecondVector(step.kind) ? valuesOf(step.b) : std::span<float>();
    const std::span<const float> constants(constants_.data() + step.firstConstant, step.constantCount);
    const std::span<float> out = valuesOf(step.result);
    switch (step.kind) {
    case Operation::matrixProduct:
        return multiplyMatrix(a, constants.data(), out);
    case Operation::addConstants:
        return pairs(a, constants, out, std::plus<>());
    case Operation::subtractConstants:
        return pairs(a, constants, out, std::minus<>());
    case Operation::multiplyConstants:
        return pairs(a, constants, out, std::multiplies<>());
    case Operation::subtractFromConstants:
        return pairs(constants, a, out, std::minus<>());
    case Operation::add:
        return pairs(a, b, out, std::plus<>());
    case Operation::subtract:
        return pairs(a, b, out, std::minus<>());
    case Operation::multiply:
        return pairs(a, b, out, std::multiplies<>());
    case Operation::clip:
        pairs(a, constants.first(constants.size() / 2), out, [](float x, float least) { return std::max(x, least); });
        return pairs(out, constants.last(constants.size() / 2), out,
                     [](float x, float most) { return std::min(x, most); });
    case Operation::leakyRelu:
        return each(a, out, [&](float x) { return x < 0.0F ? step.parameter * x : x; });
    case Operation::relu:
        return each(a, out, [](float x) { return x < 0.0F ? 0.0F : x; });
    case Operation::tanh:
        return each(a, out, hyperbolicTangent);
    case Operation::sigmoid:
        return each(a, out, logistic);
    }
}

} // namespace viewer
