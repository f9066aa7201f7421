// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <span>
#include <utility>

namespace storage {

/// An open file of the system, closed with its owner. Thread: any, one at a time.
class Descriptor {
public:
    /// `number` from open(); negative for none.
    explicit Descriptor(int number = -1)
        : number_(number) {}
    ~Descriptor() { close(); }
    Descriptor(Descriptor&& other) noexcept
        : number_(std::exchange(other.number_, -1)) {}
    Descriptor& operator=(Descriptor&& other) noexcept;
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;

    int number() const { return number_; }
    bool isOpen() const { return number_ >= 0; }
    /// False, with errno, when the system has an error of before to tell; closed all the same.
    bool close();

private:
    int number_;
};

/// Reads from byte `from` of a file on, until `bytes` are full or the file ends. Answers how many came; below 0, with
/// errno, when the system fails.
std::ptrdiff_t readAt(int descriptor, std::uint64_t from, std::span<std::byte> bytes);

/// Whether a path, whose last part is no link, leads to the file that is open.
bool isAt(const std::filesystem::path& path, int descriptor);

/// Writes all of it where the descriptor stands. Answers 0, or the errno of what kept it from it.
int writeAll(int descriptor, std::span<const std::byte> bytes);

} // namespace storage
