// SPDX-License-Identifier: Apache-2.0
// The numbers of a page: arrays of one type each, by name.
#pragma once

#include "viewer/Blocks.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

namespace quarn {

/// An array as it lies in the page: little-endian, without a header.
struct PageBlock {
    std::string name;
    const char* type;      ///< as the manifest names it: "f32" and the like; "bytes" for a file
    std::size_t count = 0; ///< numbers
    std::vector<std::byte> bytes;
};

/// The blocks in the order in which they are written. Thread: one at a time.
class PageBlocks {
public:
    template <class Numbers>
    void add(std::string name, const Numbers& numbers) {
        const std::span values(numbers);
        using Number = std::remove_cv_t<typename decltype(values)::element_type>;
        const auto bytes = std::as_bytes(values);
        all_.push_back({std::move(name), typeOf<Number>(), values.size(), {bytes.begin(), bytes.end()}});
    }
    /// Nothing where there are no numbers: for what may be left out.
    template <class Numbers>
    void addIfAny(std::string name, const Numbers& numbers) {
        if (!std::empty(numbers))
            add(std::move(name), numbers);
    }

    const std::vector<PageBlock>& all() const { return all_; }
    /// The same bytes for the core, as a page gives them to it.
    viewer::Blocks opened() const {
        viewer::Blocks blocks;
        for (const PageBlock& block : all_)
            blocks.add(block.name, block.bytes);
        return blocks;
    }

private:
    template <class Number>
    static constexpr const char* typeOf() {
        if constexpr (std::is_same_v<Number, std::byte>)
            return "bytes";
        else if constexpr (std::is_floating_point_v<Number>)
            return sizeof(Number) == 4 ? "f32" : "f64";
        else if constexpr (std::is_signed_v<Number>)
            return sizeof(Number) == 1 ? "i8" : sizeof(Number) == 2 ? "i16" : "i32";
        else
            return sizeof(Number) == 1 ? "u8" : sizeof(Number) == 4 ? "u32" : "u64";
    }

    std::vector<PageBlock> all_;
};

} // namespace quarn
