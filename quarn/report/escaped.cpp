// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/escaped.h"

#include "quarn/console/printable.h"

namespace quarn {

std::string escaped(std::string_view text) {
    std::string all;
    for (const char character : printable(text))
        switch (character) {
        case '<':
            all += "&lt;";
            break;
        case '>':
            all += "&gt;";
            break;
        case '&':
            all += "&amp;";
            break;
        case '"':
            all += "&quot;";
            break;
        case '\'':
            all += "&#39;";
            break;
        default:
            all += character;
        }
    return all;
}

} // namespace quarn
