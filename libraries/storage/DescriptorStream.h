// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstddef>
#include <ostream>
#include <streambuf>

namespace storage {

/// What is written to it goes to a descriptor, whose owner is another. Remembers why a write failed.
class DescriptorBuffer : public std::streambuf {
public:
    explicit DescriptorBuffer(int descriptor);
    ~DescriptorBuffer() override;
    /// The errno of the first write that failed; 0 for none. Nothing is written after it.
    int error() const { return error_; }

protected:
    int_type overflow(int_type c) override;
    std::streamsize xsputn(const char* text, std::streamsize size) override;
    int sync() override;

private:
    bool put(const char* text, std::size_t size);

    std::array<char, 1U << 16U> room_;
    int descriptor_;
    int error_ = 0;
};

/// A stream of one, in the classic locale. flush() it at the end: destruction does not.
class DescriptorStream : public std::ostream {
public:
    explicit DescriptorStream(int descriptor);
    ~DescriptorStream() override;
    int error() const { return buffer_.error(); }

private:
    DescriptorBuffer buffer_;
};

} // namespace storage
