// SPDX-License-Identifier: Apache-2.0
// Elements of an array attribute, by logical index.
#pragma once

#include <algorithm>
#include <cstddef>
#include <memory>
#include <utility>
#include <vector>

namespace OpenQuarn {

/// Shared pointers on T, sorted by an unsigned index, in blocks of a bounded size: finding takes the logarithm of the
/// size, inserting and removing anywhere a bounded number of moves, and counting up to a position one step a block. So
/// 100 000 elements can be added in any order and read in any order without quadratic cost.
template <class T>
class SparseArray {
public:
    struct Entry {
        unsigned index;
        std::shared_ptr<T> item;
    };

    std::size_t size() const { return size_; }
    bool empty() const { return size_ == 0; }

    /// Null when there is none.
    std::shared_ptr<T> find(unsigned index) const {
        const std::size_t block = blockOf(index);
        if (block == blocks_.size())
            return nullptr;
        const auto entry = lowerBound(blocks_[block], index);
        return entry != blocks_[block].end() && entry->index == index ? entry->item : nullptr;
    }

    /// The first entry whose index is not below `index`; null when there is none.
    const Entry* atOrAfter(unsigned index) const {
        const std::size_t block = blockOf(index);
        return block == blocks_.size() ? nullptr : &*lowerBound(blocks_[block], index);
    }

    /// The `position`-th entry in order of index; null beyond the last.
    const Entry* at(std::size_t position) const {
        for (const Block& block : blocks_) {
            if (position < block.size())
                return &block[position];
            position -= block.size();
        }
        return nullptr;
    }

    /// Adds an item under an index that has none.
    void insert(unsigned index, std::shared_ptr<T> item) {
        std::size_t block = blockOf(index);
        if (block == blocks_.size()) {
            if (blocks_.empty() || blocks_.back().size() == blockSize)
                blocks_.emplace_back();
            block = blocks_.size() - 1;
        }
        Block& entries = blocks_[block];
        entries.insert(lowerBound(entries, index), Entry{index, std::move(item)});
        ++size_;
        if (entries.size() > blockSize)
            split(block);
    }

    /// The item that was there; null when there was none.
    std::shared_ptr<T> remove(unsigned index) {
        const std::size_t block = blockOf(index);
        if (block == blocks_.size())
            return nullptr;
        const auto entry = lowerBound(blocks_[block], index);
        if (entry->index != index)
            return nullptr;
        std::shared_ptr<T> item = std::move(entry->item);
        blocks_[block].erase(entry);
        --size_;
        if (blocks_[block].empty())
            blocks_.erase(blocks_.begin() + static_cast<std::ptrdiff_t>(block));
        return item;
    }

    void clear() {
        blocks_.clear();
        size_ = 0;
    }

    /// Calls `visit(index, item)` in ascending order of index.
    template <class Visit>
    void forEach(Visit&& visit) const {
        for (const Block& block : blocks_)
            for (const Entry& entry : block)
                visit(entry.index, entry.item);
    }

private:
    using Block = std::vector<Entry>;
    static constexpr std::size_t blockSize = 512;

    // the first block that reaches up to the index; no block is empty
    std::size_t blockOf(unsigned index) const {
        const auto block = std::partition_point(blocks_.begin(), blocks_.end(),
                                                [&](const Block& entries) { return entries.back().index < index; });
        return static_cast<std::size_t>(block - blocks_.begin());
    }

    template <class Entries>
    static auto lowerBound(Entries& entries, unsigned index) {
        return std::partition_point(entries.begin(), entries.end(),
                                    [&](const Entry& entry) { return entry.index < index; });
    }

    void split(std::size_t block) {
        // an array that grows at its end keeps full blocks behind it
        const std::size_t keep = block + 1 == blocks_.size() ? blockSize : blockSize / 2;
        Block tail(std::make_move_iterator(blocks_[block].begin() + static_cast<std::ptrdiff_t>(keep)),
                   std::make_move_iterator(blocks_[block].end()));
        blocks_[block].resize(keep);
        blocks_.insert(blocks_.begin() + static_cast<std::ptrdiff_t>(block) + 1, std::move(tail));
    }

    std::vector<Block> blocks_;
    std::size_t size_ = 0;
};

} // namespace OpenQuarn
