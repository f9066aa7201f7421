// SPDX-License-Identifier: Apache-2.0
// Archives of NumPy with several arrays, each by its name: what numpy.savez and numpy.savez_compressed write.
#pragma once

#include "storage/DeflatedStream.h"
#include "storage/Descriptor.h"
#include "storage/npyHeader.h"
#include "storage/zipArchive.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <span>
#include <string>

namespace storage {

/// An array of an archive, read once from its first number to its last. Errors are std::runtime_error with the reason
/// alone. Thread: one at a time.
class NpzArray {
public:
    /// `member` stored or deflated.
    explicit NpzArray(const ZipMember& member);

    /// As the file says: not checked against anything.
    const NpyArray& head() const { return head_; }
    /// Throws unless numbers of `numberSize` bytes in the shape of head() are just what there is: so many at most as
    /// the file has bytes, or a thousand times as many where they are deflated.
    void requireSize(std::size_t numberSize) const;
    /// The next bytes of the numbers, unpacked. Throws when there are not so many.
    void read(std::span<std::byte> bytes);
    /// Throws unless all has been read, and the archive's own sum is that of what was.
    void finish();

private:
    ZipMember member_;
    std::optional<DeflatedStream> deflated_;
    std::uint64_t place_ = 0; ///< of the next byte of the member
    std::uint32_t crc_ = 0;   ///< of those before
    NpyArray head_;
};

/// Reads only. Thread: any, one at a time.
class NpzFile {
public:
    /// Throws FileError, also for a file of more than npyArrayFileLimit bytes.
    explicit NpzFile(const std::filesystem::path& path);

    /// The array that numpy.load gives under that name, for as long as the file is open. Throws std::runtime_error,
    /// with the reason alone, when there is none that can be read.
    NpzArray array(const std::string& name) const;
    /// Whether there is one of that name. Throws as array() does where that cannot be told.
    bool contains(const std::string& name) const;

private:
    Descriptor file_;
    std::uint64_t size_ = 0;
};

} // namespace storage
