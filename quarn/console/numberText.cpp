// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/numberText.h"

#include <sstream>

namespace quarn {

namespace {

std::string textOf(double value, int digits) {
    std::ostringstream text;
    text.imbue(std::locale::classic());
    text.precision(digits);
    text << value;
    return text.str();
}

} // namespace

std::string numberText(double value) {
    return textOf(value, 6);
}

std::string roughText(double value) {
    return textOf(value, 3);
}

} // namespace quarn
