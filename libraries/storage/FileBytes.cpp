// SPDX-License-Identifier: Apache-2.0
#include "storage/FileBytes.h"

#include "storage/Descriptor.h"
#include "storage/FileError.h"

#include <algorithm>
#include <cerrno>
#include <stdexcept>

namespace storage {

void FileBytes::read(std::uint64_t from, std::span<std::byte> bytes) const {
    if (from > size || bytes.size() > size - from)
        throw std::out_of_range("bytes beyond a part of a file");
    const std::ptrdiff_t got = readAt(descriptor, start + from, bytes);
    if (got < 0)
        throw std::runtime_error(textOfErrno(errno));
    if (static_cast<std::size_t>(got) < bytes.size())
        throw std::runtime_error("it has been cut short since it was opened");
}

std::string FileBytes::text(std::uint64_t from, std::size_t length) const {
    std::string bytes(from < size ? std::min<std::uint64_t>(length, size - from) : 0, '\0');
    read(std::min(from, size), std::as_writable_bytes(std::span(bytes)));
    return bytes;
}

FileBytes FileBytes::part(std::uint64_t from, std::uint64_t length) const {
    if (from > size || length > size - from)
        throw std::out_of_range("a part beyond a part of a file");
    return {descriptor, start + from, length};
}

} // namespace storage
