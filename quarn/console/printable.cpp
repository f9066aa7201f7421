// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/printable.h"

#include "storage/encodings.h"

#include <algorithm>

namespace quarn {
namespace {

unsigned byteAt(std::string_view text, std::size_t i) {
    return i < text.size() ? static_cast<unsigned char>(text[i]) : 0;
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
        const std::size_t length = std::max<std::size_t>(1, storage::utf8Length(text.substr(i)));
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
