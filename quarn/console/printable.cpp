// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/printable.h"

#include <cstdint>

namespace quarn {
namespace {

unsigned byteAt(std::string_view text, std::size_t i) {
    return i < text.size() ? static_cast<unsigned char>(text[i]) : 0;
}

// how many bytes of a character follow its first one; 0 for those that stand alone, and for what begins none
std::size_t continuations(unsigned first) {
    return first >= 0xc2 && first < 0xe0   ? 1
           : first >= 0xe0 && first < 0xf0 ? 2
           : first >= 0xf0 && first < 0xf5 ? 3
                                           : 0;
}

// the bytes of the character at `i`; 1 for what is none
std::size_t lengthAt(std::string_view text, std::size_t i) {
    const std::size_t more = continuations(byteAt(text, i));
    for (std::size_t k = 1; k <= more; ++k)
        if ((byteAt(text, i + k) & 0xc0U) != 0x80)
            return 1;
    return 1 + more;
}

void appendEscape(std::string& out, unsigned code) {
    constexpr std::string_view digits = "0123456789abcdef";
    out += "\\u00";
    out += digits[code >> 4U];
    out += digits[code & 15U];
}

bool isControl(unsigned code) {
    return (code < 0x20 && code != '\n' && code != '\t') || code == 0x7f;
}

} // namespace

std::string printable(std::string_view text) {
    std::string out;
    out.reserve(text.size());
    for (std::size_t i = 0; i < text.size();) {
        const unsigned first = byteAt(text, i);
        const std::size_t length = lengthAt(text, i);
        if (length == 2 && first == 0xc2 && byteAt(text, i + 1) < 0xa0)
            appendEscape(out, byteAt(text, i + 1)); // the second set of control characters
        else if (length == 1 && (isControl(first) || first >= 0x80))
            appendEscape(out, first);
        else
            out += text.substr(i, length);
        i += length;
    }
    return out;
}

} // namespace quarn
