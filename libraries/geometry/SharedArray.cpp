// SPDX-License-Identifier: Apache-2.0
#include "quill/SharedArray.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <mutex>
#include <unordered_map>

namespace quill {
namespace {

struct Entry {
    std::weak_ptr<const void> array;
    const void* bytes; // while `array` lives
    std::size_t size;
    std::type_index type;
};

/// Which arrays may be the same: their size, and some of their bytes. (FNV-1a, 64 bits)
std::uint64_t keyOf(const void* bytes, std::size_t size) {
    constexpr std::uint64_t offset = 0xcbf29ce484222325, prime = 0x100000001b3;
    constexpr std::size_t samples = 4096;
    const auto* const from = static_cast<const unsigned char*>(bytes);
    const std::size_t step = size / samples + 1;
    std::uint64_t key = (offset ^ size) * prime;
    for (std::size_t i = 0; i < size; i += step)
        key = (key ^ from[i]) * prime;
    return key;
}

class Registry {
public:
    std::shared_ptr<const void> find(std::shared_ptr<const void> array, const Entry& wanted, std::uint64_t key) {
        const std::scoped_lock lock(mutex_);
        const auto [begin, end] = entries_.equal_range(key);
        for (auto at = begin; at != end; ++at) {
            std::shared_ptr<const void> there = at->second.array.lock();
            if (there && at->second.type == wanted.type && at->second.size == wanted.size &&
                std::memcmp(at->second.bytes, wanted.bytes, wanted.size) == 0)
                return there;
        }
        if (entries_.size() >= mostEntries_) {
            std::erase_if(entries_, [](const auto& entry) { return entry.second.array.expired(); });
            mostEntries_ = std::max(fewestEntries, 2 * entries_.size());
        }
        entries_.emplace(key, wanted);
        return array;
    }

private:
    static constexpr std::size_t fewestEntries = 256;
    std::mutex mutex_;
    std::unordered_multimap<std::uint64_t, Entry> entries_; // those that have gone too, until there are many
    std::size_t mostEntries_ = fewestEntries;
};

} // namespace

std::shared_ptr<const void> sharedContent(std::shared_ptr<const void> array, const void* bytes, std::size_t size,
                                          std::type_index type) {
    static Registry registry;
    const Entry wanted{array, bytes, size, type};
    return registry.find(std::move(array), wanted, keyOf(bytes, size));
}

} // namespace quill
