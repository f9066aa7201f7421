// SPDX-License-Identifier: Apache-2.0
// Texts that come from files, on a terminal.
#pragma once

#include <string>
#include <string_view>

namespace quarn {

/// The text as a terminal may get it: control characters other than line ends and tabs, and bytes that are no UTF-8,
/// stand as the escapes that JSON has for them, "\u001b". A name in a file could otherwise move the cursor, colour what
/// follows, or answer in the user's place. JSON stays the same JSON. Thread: any.
std::string printable(std::string_view text);

} // namespace quarn
