// SPDX-License-Identifier: Apache-2.0
#include "storage/unpackZlib.h"

#include <stdexcept>

#include <zlib.h>

namespace storage {

std::string unpackZlib(std::string_view packed, std::size_t size) {
    constexpr std::size_t mostOfAByte = 1032; // that is as far as deflate goes (zlib, "Technical Details")
    if (size / mostOfAByte > packed.size())
        throw std::runtime_error(std::to_string(packed.size()) + " packed bytes cannot be " + std::to_string(size));
    std::string bytes(size, '\0');
    uLongf written = size;
    uLong read = packed.size();
    const int answer = uncompress2(reinterpret_cast<Bytef*>(bytes.data()), &written,
                                   reinterpret_cast<const Bytef*>(packed.data()), &read);
    if (answer != Z_OK || written != size || read != packed.size())
        throw std::runtime_error("packed bytes are damaged, or are not " + std::to_string(size));
    return bytes;
}

} // namespace storage
