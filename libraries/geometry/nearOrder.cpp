// SPDX-License-Identifier: Apache-2.0
#include "nearOrder.h"

#include <algorithm>

namespace quill {
namespace {

class BreadthFirst {
public:
    BreadthFirst(const std::vector<std::uint32_t>& neighbours, const std::vector<std::uint32_t>& indexer)
        : neighbours_(neighbours)
        , indexer_(indexer)
        , round_(indexer.size() - 1, 0) {}

    std::size_t vertexCount() const { return round_.size(); }
    std::uint32_t degree(std::uint32_t v) const { return indexer_[v + 1] - indexer_[v]; }

    // Appends all that can be reached from `start`, in rings, each vertex's unseen neighbours by their number of
    // neighbours. What was appended since the last newRound() counts as seen. Gives the number of rings.
    std::size_t append(std::uint32_t start, std::vector<std::uint32_t>& out) {
        std::size_t at = out.size(), rings = 0;
        out.push_back(start);
        round_[start] = now_;
        while (at < out.size()) {
            ++rings;
            for (const std::size_t ringEnd = out.size(); at < ringEnd; ++at) {
                const auto first = static_cast<std::ptrdiff_t>(out.size());
                for (std::uint32_t k = indexer_[out[at]]; k < indexer_[out[at] + 1]; ++k)
                    if (const std::uint32_t w = neighbours_[k]; round_[w] != now_) {
                        round_[w] = now_;
                        out.push_back(w);
                    }
                std::sort(out.begin() + first, out.end(), [this](std::uint32_t a, std::uint32_t b) {
                    return degree(a) != degree(b) ? degree(a) < degree(b) : a < b;
                });
            }
        }
        return rings;
    }
    void newRound() { ++now_; }
    bool isSeen(std::uint32_t v) const { return round_[v] == now_; }

private:
    const std::vector<std::uint32_t>& neighbours_;
    const std::vector<std::uint32_t>& indexer_;
    std::vector<std::uint32_t> round_;
    std::uint32_t now_ = 1;
};

} // namespace

std::size_t farthestNeighbour(const std::vector<std::uint32_t>& neighbours, const std::vector<std::uint32_t>& indexer,
                              const std::vector<std::uint32_t>& placeOf) {
    std::size_t farthest = 0;
    for (std::size_t v = 0; v + 1 < indexer.size(); ++v)
        for (std::uint32_t k = indexer[v]; k < indexer[v + 1]; ++k) {
            const std::size_t a = placeOf.empty() ? v : placeOf[v];
            const std::size_t b = placeOf.empty() ? neighbours[k] : placeOf[neighbours[k]];
            farthest = std::max(farthest, a < b ? b - a : a - b);
        }
    return farthest;
}

std::vector<std::uint32_t> nearOrder(const std::vector<std::uint32_t>& neighbours,
                                     const std::vector<std::uint32_t>& indexer, std::size_t vertexCount) {
    std::vector<std::uint32_t> order;
    order.reserve(vertexCount);
    if (!indexer.empty()) {
        BreadthFirst ends(neighbours, indexer), search(neighbours, indexer);
        std::vector<std::uint32_t> reached;
        for (std::uint32_t v = 0; v < search.vertexCount(); ++v) {
            if (search.isSeen(v))
                continue;
            // the last of all from anywhere is near an end of the mesh, from where rings are narrow
            reached.clear();
            ends.append(v, reached);
            search.append(reached.back(), order);
        }
    }
    std::reverse(order.begin(), order.end());
    for (std::size_t v = order.size(); v < vertexCount; ++v)
        order.push_back(static_cast<std::uint32_t>(v));
    return order;
}

} // namespace quill
