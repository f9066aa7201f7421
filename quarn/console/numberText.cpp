// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/numberText.h"

#include <sstream>

namespace quarn {

std::string numberText(double value) {
    std::ostringstream text;
    text.imbue(std::locale::classic());
    text << value;
    return text.str();
}

} // namespace quarn
