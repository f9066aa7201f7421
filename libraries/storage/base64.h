// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

namespace storage {

/// The bytes in base 64, padded with "=" (RFC 4648, section 4). Thread: any.
std::string base64(std::string_view bytes);

} // namespace storage
