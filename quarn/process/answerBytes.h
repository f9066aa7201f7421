// SPDX-License-Identifier: Apache-2.0
// Values as bytes, for the way between two copies of one program (runApart). Numbers, enumerations and all else that
// has no pointer in it go as they are in memory; texts and lists with their sizes before them; any other class by a
// function transfer(archive, value) beside the class, which hands its members to the archive, in one order for both
// ways.
#pragma once

#include <cstring>
#include <stdexcept>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

namespace quarn {

/// The bytes are not what a Packer has made.
class DamagedAnswer : public std::runtime_error {
public:
    DamagedAnswer()
        : std::runtime_error("the answer of the other process is damaged") {}
};

/// Into bytes. Thread: any, one at a time.
class Packer {
public:
    template <class T>
    requires std::is_trivially_copyable_v<T>
    void operator()(const T& value) { append(&value, sizeof value); }
    void operator()(const std::string& text) {
        operator()(text.size());
        bytes_ += text;
    }
    template <class T>
    void operator()(const std::vector<T>& values) {
        operator()(values.size());
        if constexpr (std::is_trivially_copyable_v<T>)
            append(values.data(), values.size() * sizeof(T));
        else
            for (const T& value : values)
                element(value);
    }
    std::string take() { return std::move(bytes_); }

private:
    void element(const std::string& text) { operator()(text); }
    template <class T>
    void element(const std::vector<T>& values) {
        operator()(values);
    }
    template <class T>
    void element(const T& value) {
        transfer(*this, value);
    }
    void append(const void* bytes, std::size_t size) {
        if (size > 0)
            bytes_.append(static_cast<const char*>(bytes), size);
    }

    std::string bytes_;
};

/// The other way; trusts nothing, and takes no memory for what is not there: throws DamagedAnswer. What the values may
/// be is its user's to check. Thread: any, one at a time.
class Unpacker {
public:
    /// The bytes stay their owner's, and must live as long.
    explicit Unpacker(std::string_view bytes)
        : bytes_(bytes) {}

    template <class T>
    requires std::is_trivially_copyable_v<T>
    void operator()(T& value) { copy(&value, sizeof value); }
    void operator()(bool& value) {
        char byte = 0; // another value than 0 and 1 would be no bool
        copy(&byte, 1);
        value = byte != 0;
    }
    void operator()(std::string& text) {
        text.resize(count(1));
        copy(text.data(), text.size());
    }
    template <class T>
    void operator()(std::vector<T>& values) {
        if constexpr (std::is_trivially_copyable_v<T>) {
            values.resize(count(sizeof(T)));
            copy(values.data(), values.size() * sizeof(T));
        } else {
            // one by one, as far as there are bytes: each takes at least those of a size
            const std::size_t size = count(sizeof(std::size_t));
            values.clear();
            for (std::size_t i = 0; i < size; ++i)
                element(values.emplace_back());
        }
    }
    bool atEnd() const { return bytes_.empty(); }

private:
    void element(std::string& text) { operator()(text); }
    template <class T>
    void element(std::vector<T>& values) {
        operator()(values);
    }
    template <class T>
    void element(T& value) {
        transfer(*this, value);
    }
    // of elements that take at least `least` bytes each: never more than there can be
    std::size_t count(std::size_t least) {
        std::size_t number = 0;
        copy(&number, sizeof number);
        if (number > bytes_.size() / least)
            throw DamagedAnswer();
        return number;
    }
    void copy(void* to, std::size_t size) {
        if (size > bytes_.size())
            throw DamagedAnswer();
        if (size > 0)
            std::memcpy(to, bytes_.data(), size);
        bytes_.remove_prefix(size);
    }

    std::string_view bytes_;
};

} // namespace quarn
