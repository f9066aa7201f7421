// SPDX-License-Identifier: Apache-2.0
#include "storage/DescriptorStream.h"

#include "storage/Descriptor.h"

#include <algorithm>
#include <locale>
#include <span>

namespace storage {

DescriptorBuffer::DescriptorBuffer(int descriptor)
    : descriptor_(descriptor) {
    setp(room_.data(), room_.data() + room_.size());
}

DescriptorBuffer::~DescriptorBuffer() = default;

bool DescriptorBuffer::put(const char* text, std::size_t size) {
    if (error_ == 0)
        error_ = writeAll(descriptor_, std::as_bytes(std::span(text, size)));
    return error_ == 0;
}

int DescriptorBuffer::sync() {
    const bool isWritten = put(pbase(), static_cast<std::size_t>(pptr() - pbase()));
    setp(room_.data(), room_.data() + room_.size());
    return isWritten ? 0 : -1;
}

DescriptorBuffer::int_type DescriptorBuffer::overflow(int_type c) {
    if (sync() != 0)
        return traits_type::eof();
    if (!traits_type::eq_int_type(c, traits_type::eof())) {
        *pptr() = traits_type::to_char_type(c);
        pbump(1);
    }
    return traits_type::not_eof(c);
}

std::streamsize DescriptorBuffer::xsputn(const char* text, std::streamsize size) {
    if (size > epptr() - pptr() && sync() != 0)
        return 0;
    if (size > epptr() - pptr()) // more than the room holds
        return put(text, static_cast<std::size_t>(size)) ? size : 0;
    std::copy_n(text, size, pptr()); // of nothing, also from nowhere
    pbump(static_cast<int>(size));
    return size;
}

DescriptorStream::DescriptorStream(int descriptor)
    : std::ostream(nullptr)
    , buffer_(descriptor) {
    rdbuf(&buffer_);
    imbue(std::locale::classic());
}

DescriptorStream::~DescriptorStream() = default;

} // namespace storage
