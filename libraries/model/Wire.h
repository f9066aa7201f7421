// SPDX-License-Identifier: Apache-2.0
// Protocol buffers as they lie in a file: what network files are made of.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <streambuf>
#include <string>

namespace neuralWarp {

/// Reads the wire format of protocol buffers (protobuf.dev, "Encoding"), field by field. A message is not told from a
/// text: the caller knows which fields are messages, and reads on inside them. Whatever is not well-formed, or longer
/// than the bytes that are left, throws std::runtime_error with the reason.
class Wire {
public:
    /// How a field's value lies in the file, by the numbers of the format.
    enum class Form : std::uint8_t { varint = 0, fixed64 = 1, bytes = 2, fixed32 = 5 };

    struct Field {
        std::uint64_t number;
        Form form;
        std::uint64_t value; ///< the number itself (its bits); of `bytes` how many follow, which are still to be read

        bool is(std::uint64_t wanted, Form wantedForm) const { return number == wanted && form == wantedForm; }
    };

    /// Bytes that are kept of a text: of all the names that are compared the longest that matters is shorter by far.
    static constexpr std::uint64_t longestText = 512;

    /// `size` bytes of a source, which outlives this.
    Wire(std::streambuf& source, std::uint64_t size)
        : source_(source)
        , size_(size) {}

    std::uint64_t position() const { return position_; }
    std::uint64_t size() const { return size_; }

    /// The next field of a message that ends at the position `end`.
    Field field(std::uint64_t end);
    std::uint64_t varint();
    /// The low bytes first; at most 8.
    std::uint64_t fixed(std::uint64_t bytes);
    /// The first longestText of `length` bytes, and past the others.
    std::string text(std::uint64_t length);
    void read(std::span<std::byte> bytes);
    void skip(std::uint64_t length);

    [[noreturn]] static void throwTruncated();

private:
    using Traits = std::streambuf::traits_type;

    std::uint8_t next();

    std::streambuf& source_;
    std::uint64_t position_ = 0;
    std::uint64_t size_;
};

} // namespace neuralWarp
