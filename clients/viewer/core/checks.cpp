// SPDX-License-Identifier: Apache-2.0
#include "checks.h"

#include <cmath>
#include <limits>
#include <stdexcept>

namespace viewer {
namespace {

template <class T>
void checkAllFinite(std::string_view block, std::span<const T> values) {
    for (std::size_t i = 0; i < values.size(); ++i)
        if (!std::isfinite(values[i]))
            refuse(block, "number " + std::to_string(i) + " is not finite");
}

} // namespace

void refuse(std::string_view block, const std::string& what) {
    throw std::runtime_error("the block \"" + std::string(block) + "\": " + what);
}

std::uint64_t product(std::initializer_list<std::uint64_t> counts) {
    constexpr std::uint64_t most = std::numeric_limits<std::uint64_t>::max();
    std::uint64_t made = 1;
    for (const std::uint64_t count : counts)
        made = count != 0 && made > most / count ? most : made * count;
    return made;
}

std::uint32_t total(std::string_view block, std::span<const std::uint32_t> counts) {
    std::uint64_t sum = 0;
    for (const std::uint32_t count : counts)
        sum += count;
    if (sum > std::numeric_limits<std::uint32_t>::max())
        refuse(block, "its counts add up to " + std::to_string(sum));
    return static_cast<std::uint32_t>(sum);
}

void checkCount(std::string_view block, std::size_t has, std::uint64_t needed) {
    if (has != needed)
        refuse(block, "it has " + std::to_string(has) + " numbers, and " + std::to_string(needed) + " are needed");
}

void checkBelow(std::string_view block, std::span<const std::uint32_t> indices, std::size_t end, const char* what) {
    for (std::size_t i = 0; i < indices.size(); ++i)
        if (indices[i] >= end)
            refuse(block, "number " + std::to_string(i) + " is " + std::to_string(indices[i]) + ", and there are " +
                              std::to_string(end) + ' ' + what);
}

void checkFinite(std::string_view block, std::span<const double> values) {
    checkAllFinite(block, values);
}

void checkFinite(std::string_view block, std::span<const float> values) {
    checkAllFinite(block, values);
}

} // namespace viewer
