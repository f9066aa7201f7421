// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/numberText.h"

#include <cmath>
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

double roundedUp(double value) {
    if (!(value > 0.0))
        return 1.0;
    const double power = std::pow(10.0, std::floor(std::log10(value)));
    for (const double step : {1.0, 2.0, 5.0})
        if (value <= step * power * (1.0 + 1e-9))
            return step * power;
    return 10.0 * power;
}

} // namespace quarn
