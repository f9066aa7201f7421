// SPDX-License-Identifier: Apache-2.0
// The arrays of a page, by their names.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace viewer {

/// An array that is there as long as somebody holds it.
template <class T>
struct HeldArray {
    std::shared_ptr<const std::byte> owner;
    std::span<const T> values;
};

/// Arrays of one type each, without a header, in the byte order of the machine (pages are little-endian). What they
/// hold is not looked at. Copies share the bytes. One thread at a time; const members may run at the same time.
class Blocks {
public:
    /// Adds an array, and measures its sum. Throws std::runtime_error for a name that is there already.
    void add(std::string name, std::vector<std::byte> bytes);
    /// The same of memory that begins where any number may.
    void add(std::string name, std::shared_ptr<const std::byte> bytes, std::size_t size);

    bool has(std::string_view name) const { return blocks_.find(name) != blocks_.end(); }
    /// The bytes of a block, for as long as this lives; throws std::runtime_error when it is absent.
    std::span<const std::byte> bytes(std::string_view name) const;
    /// The same as numbers; throws too when they are no whole number of them.
    template <class T>
    std::span<const T> array(std::string_view name) const {
        return held<T>(name).values;
    }
    /// The same, to be kept beyond this.
    template <class T>
    HeldArray<T> held(std::string_view name) const {
        const Block& block = find(name);
        if (block.size % sizeof(T) != 0)
            throw std::runtime_error(unwhole(name, block.size, sizeof(T)));
        // NOLINTNEXTLINE(cppcoreguidelines-pro-type-reinterpret-cast): aligned for any number
        return {block.bytes, {reinterpret_cast<const T*>(block.bytes.get()), block.size / sizeof(T)}};
    }

    /// FNV-1a with 64 bits over the bytes; throws std::runtime_error when the block is absent.
    std::uint64_t sum(std::string_view name) const { return find(name).sum; }
    /// Lets go of all bytes, of which only the sums stay: every block is empty then.
    void forgetBytes();

private:
    struct Block {
        std::shared_ptr<const std::byte> bytes;
        std::size_t size = 0;
        std::uint64_t sum = 0;
    };
    const Block& find(std::string_view name) const;
    static std::string unwhole(std::string_view name, std::size_t size, std::size_t each);

    std::map<std::string, Block, std::less<>> blocks_;
};

} // namespace viewer
