// SPDX-License-Identifier: Apache-2.0
#include "Wire.h"

#include <algorithm>
#include <ios>
#include <limits>
#include <stdexcept>

namespace neuralWarp {

Wire::Field Wire::field(std::uint64_t end) {
    const std::uint64_t key = varint();
    if (key > std::numeric_limits<std::uint32_t>::max()) // the runtime would drop what is beyond, and see another
        throw std::runtime_error("the file is damaged: a field in it has no number");
    const std::uint64_t number = key >> 3U;
    switch (key & 7U) {
    case 0:
        return {number, Form::varint, varint()};
    case 1:
        return {number, Form::fixed64, fixed(8)};
    case 5:
        return {number, Form::fixed32, fixed(4)};
    case 2:
        break;
    default:
        throw std::runtime_error("the file is damaged, or no ONNX file");
    }
    const std::uint64_t length = varint();
    if (length > end - std::min(end, position_))
        throwTruncated();
    return {number, Form::bytes, length};
}

std::uint64_t Wire::varint() {
    std::uint64_t value = 0;
    for (unsigned shift = 0; shift < 70; shift += 7) {
        const std::uint64_t byte = next();
        if (shift < 64)
            value |= (byte & 127U) << shift;
        if (byte < 128)
            return value;
    }
    throw std::runtime_error("the file is damaged: a number in it has no end");
}

std::uint64_t Wire::fixed(std::uint64_t bytes) {
    std::uint64_t value = 0;
    for (std::uint64_t i = 0; i < bytes; ++i)
        value |= std::uint64_t{next()} << (8 * i);
    return value;
}

std::string Wire::text(std::uint64_t length) {
    std::string bytes(static_cast<std::size_t>(std::min(length, longestText)), '\0');
    for (char& byte : bytes)
        byte = static_cast<char>(next());
    skip(length - bytes.size());
    return bytes;
}

void Wire::read(std::span<std::byte> bytes) {
    const auto count = static_cast<std::streamsize>(bytes.size());
    if (bytes.size() > size_ - position_ || source_.sgetn(reinterpret_cast<char*>(bytes.data()), count) != count)
        throwTruncated();
    position_ += bytes.size();
}

void Wire::skip(std::uint64_t length) {
    if (length > size_ - position_)
        throwTruncated();
    constexpr std::uint64_t readRather = 4096; // moving throws the buffer away
    const bool hasMoved = length >= readRather && source_.pubseekoff(static_cast<std::streamoff>(length), std::ios::cur,
                                                                     std::ios::in) != std::streampos(-1);
    for (std::uint64_t i = 0; !hasMoved && i < length; ++i)
        source_.sbumpc();
    position_ += length;
}

std::uint8_t Wire::next() {
    const auto byte = position_ < size_ ? source_.sbumpc() : Traits::eof();
    if (Traits::eq_int_type(byte, Traits::eof()))
        throwTruncated();
    ++position_;
    return static_cast<std::uint8_t>(Traits::to_char_type(byte));
}

void Wire::throwTruncated() {
    throw std::runtime_error("the file is damaged: it ends in the middle of a part");
}

} // namespace neuralWarp
