// SPDX-License-Identifier: Apache-2.0
// Texts that come from files, in a page.
#pragma once

#include <string>
#include <string_view>

namespace quarn {

/// The text as HTML and XML have it, in an element or between double quotes: control characters and bytes that are no
/// UTF-8 stand as in printable(), and nothing of it is markup. Thread: any.
std::string escaped(std::string_view text);

} // namespace quarn
