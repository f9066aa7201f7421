// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/Distances.h"

#include <algorithm>
#include <bit>
#include <cmath>

namespace quarn {
namespace {

// the positive floats in order are their bits in order: what is left of 13 bits is 1024 bins in every octave
// (decision 0079)
constexpr unsigned droppedBits = 13;
constexpr std::size_t binCount = std::size_t{1} << (31U - droppedBits);

std::size_t binOf(double distance) {
    return std::bit_cast<std::uint32_t>(static_cast<float>(distance)) >> droppedBits;
}

// the largest float of a bin
double endOf(std::size_t bin) {
    const auto bits = (static_cast<std::uint32_t>(bin) << droppedBits) | ((1U << droppedBits) - 1);
    return static_cast<double>(std::bit_cast<float>(bits));
}

double lengthOf(double x, double y, double z) {
    return std::sqrt(x * x + y * y + z * z);
}

} // namespace

void Distances::add(int frame, std::span<const float> a, std::span<const float> b) {
    counts_.resize(binCount);
    const auto along = [&](std::size_t i) { return static_cast<double>(a[i]) - static_cast<double>(b[i]); };
    for (std::size_t vertex = 0; 3 * vertex < a.size(); ++vertex)
        addOne(frame, vertex, lengthOf(along(3 * vertex), along(3 * vertex + 1), along(3 * vertex + 2)));
}

void Distances::addOne(int frame, std::size_t vertex, double distance) {
    ++counts_[binOf(distance)];
    ++count_;
    sum_ += distance;
    if (distance <= largest_)
        return;
    largest_ = distance;
    worstFrame_ = frame;
    worstVertex_ = vertex;
}

double Distances::mean() const {
    return count_ == 0 ? 0.0 : sum_ / static_cast<double>(count_);
}

double Distances::percentile(double part) const {
    if (count_ == 0)
        return 0.0;
    const auto rank = static_cast<std::uint64_t>(std::ceil(part * static_cast<double>(count_)));
    std::uint64_t seen = 0;
    for (std::size_t bin = 0; bin < counts_.size(); ++bin) {
        seen += counts_[bin];
        if (seen >= std::max<std::uint64_t>(rank, 1))
            return bin == 0 ? 0.0 : std::min(endOf(bin), largest_);
    }
    return largest_;
}

void Jitter::add(std::span<const float> xyz) {
    if (before_.size() == xyz.size() && last_.size() == xyz.size()) {
        const auto second = [&](std::size_t i) {
            return static_cast<double>(xyz[i]) - 2.0 * static_cast<double>(last_[i]) + static_cast<double>(before_[i]);
        };
        for (std::size_t i = 0; i + 2 < xyz.size(); i += 3)
            largest_ = std::max(largest_, lengthOf(second(i), second(i + 1), second(i + 2)));
    }
    before_.swap(last_);
    last_.assign(xyz.begin(), xyz.end());
}

} // namespace quarn
