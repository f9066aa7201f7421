// SPDX-License-Identifier: Apache-2.0
// Numbers as they lie in files.
#pragma once

#include <algorithm>
#include <bit>
#include <cstddef>
#include <cstring>
#include <string>
#include <string_view>

namespace storage {

static_assert(std::endian::native == std::endian::little, "numbers are read as they lie in a file");

/// The number whose bytes begin at `place` of `bytes`, which has them all.
template <class Number>
Number littleAt(std::string_view bytes, std::size_t place) {
    Number number;
    std::memcpy(&number, bytes.data() + place, sizeof number);
    return number;
}

template <class Number>
Number bigAt(std::string_view bytes, std::size_t place) {
    char reversed[sizeof(Number)];
    std::reverse_copy(bytes.data() + place, bytes.data() + place + sizeof reversed, reversed);
    return littleAt<Number>({reversed, sizeof reversed}, 0);
}

template <class Number>
void putLittle(std::string& bytes, Number number) {
    char raw[sizeof number];
    std::memcpy(raw, &number, sizeof number);
    bytes.append(raw, sizeof raw);
}

template <class Number>
void putBig(std::string& bytes, Number number) {
    char raw[sizeof number];
    std::memcpy(raw, &number, sizeof number);
    std::reverse(raw, raw + sizeof raw);
    bytes.append(raw, sizeof raw);
}

} // namespace storage
