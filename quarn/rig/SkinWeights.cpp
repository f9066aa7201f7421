// SPDX-License-Identifier: Apache-2.0
#include "rig/SkinWeights.h"

#include "rig/listChecks.h"
#include "rig/texts.h"

#include <algorithm>
#include <cmath>
#include <string>

namespace rig {
namespace {

// counts below 2^32, fewer than 2^32 of them: the sum is exact up to where it is too large anyway
HStatus checkLengths(const SkinLists& lists) {
    double sum = 0.0;
    for (const double count : lists.counts)
        sum += count;
    if (sum > largestIndex || lists.counts.size() > static_cast<std::size_t>(largestIndex) - 1)
        return wrong("influenceCounts add up to " + text(sum) + ", more than there can be");
    const auto expected = static_cast<std::size_t>(sum);
    for (const auto& [name, values] :
         {std::pair<const char*, const std::vector<double>&>{"influences", lists.influences},
          {"skinWeights", lists.weights}})
        if (values.size() != expected)
            return wrong(std::string(name) + " has " + std::to_string(values.size()) +
                         " values; the influenceCounts add up to " + std::to_string(expected));
    return HStatus::kSuccess;
}

HStatus check(const SkinLists& lists) {
    HStatus status = checkIndices("influenceCounts", lists.counts);
    if (!status.error())
        status = checkLengths(lists);
    if (!status.error())
        status = checkIndices("influences", lists.influences);
    return status.error() ? status : checkFinite("skinWeights", lists.weights);
}

std::vector<std::uint32_t> usedJoints(const SkinLists& lists) {
    std::vector<std::uint32_t> joints;
    joints.reserve(lists.influences.size());
    for (std::size_t i = 0; i < lists.influences.size(); ++i)
        if (lists.weights[i] != 0.0)
            joints.push_back(static_cast<std::uint32_t>(lists.influences[i]));
    std::sort(joints.begin(), joints.end());
    joints.erase(std::unique(joints.begin(), joints.end()), joints.end());
    joints.shrink_to_fit();
    return joints;
}

/// Appends the influences of one vertex, `count` values from `position`.
void append(const SkinLists& lists, std::size_t position, std::size_t count, SkinWeights& skin) {
    for (std::size_t i = position; i < position + count; ++i) {
        if (lists.weights[i] == 0.0)
            continue;
        const auto joint = static_cast<std::uint32_t>(lists.influences[i]);
        const auto found = std::lower_bound(skin.joints.begin(), skin.joints.end(), joint);
        skin.influences.push_back({lists.weights[i], static_cast<std::uint32_t>(found - skin.joints.begin())});
    }
    skin.first.push_back(static_cast<std::uint32_t>(skin.influences.size()));
}

HStatus normalizeVertex(SkinWeights& skin, std::size_t vertex) {
    double sum = 0.0;
    for (std::size_t i = skin.first[vertex]; i < skin.first[vertex + 1]; ++i)
        sum += skin.influences[i].weight;
    if (!std::isfinite(sum))
        return wrong("skinWeights of vertex " + std::to_string(vertex) + " add up to " + text(sum));
    for (std::size_t i = skin.first[vertex]; sum != 0.0 && i < skin.first[vertex + 1]; ++i)
        skin.influences[i].weight /= sum;
    return HStatus::kSuccess;
}

} // namespace

HStatus makeSkinWeights(const SkinLists& lists, bool normalize, SkinWeights& skin) {
    HStatus status = check(lists);
    if (status.error())
        return status;
    SkinWeights made;
    made.joints = usedJoints(lists);
    made.influences.reserve(lists.influences.size());
    made.first.reserve(lists.counts.size() + 1);
    made.first.push_back(0);
    std::size_t position = 0;
    for (const double number : lists.counts) {
        const auto count = static_cast<std::size_t>(number);
        append(lists, position, count, made);
        position += count;
    }
    for (std::size_t vertex = 0; normalize && vertex < made.vertexCount() && !status.error(); ++vertex)
        status = normalizeVertex(made, vertex);
    if (!status.error())
        skin = std::move(made);
    return status;
}

} // namespace rig
