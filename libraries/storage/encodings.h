// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace storage {

/// The bytes of the character that a text begins with; 0 when it is empty, or begins with no UTF-8. Thread: any.
std::size_t utf8Length(std::string_view text);
/// Whether all of it is UTF-8.
bool isUtf8(std::string_view text);

/// The bytes in base 64, padded with "=" (RFC 4648, section 4). Thread: any.
std::string base64(std::string_view bytes);
/// The bytes of such a text; with or without its "=". Nothing when it is no such text. Thread: any.
std::optional<std::string> fromBase64(std::string_view text);

} // namespace storage
