// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace storage {

/// The bytes of a zlib stream, which is all of `packed`: `size` of them, as somebody says who is not trusted. No memory
/// is taken for more than so many packed bytes can be. Throws std::runtime_error, with the reason alone, when they are
/// more or fewer or the stream is damaged. Thread: any.
std::string unpackZlib(std::string_view packed, std::size_t size);

} // namespace storage
