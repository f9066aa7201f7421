// SPDX-License-Identifier: Apache-2.0
// Archives of NumPy with several arrays, each by its name: what numpy.savez writes.
#pragma once

#include "storage/Descriptor.h"
#include "storage/npyHeader.h"
#include "storage/zipArchive.h"

#include <cstdint>
#include <filesystem>
#include <span>
#include <string>

namespace storage {

/// An array of an archive, read once from its first number to its last. Errors are std::runtime_error with the reason
/// alone. Thread: one at a time.
class NpzArray {
public:
    /// `member` a stored one: what is deflated is refused.
    explicit NpzArray(const ZipMember& member);

    /// As the file says: not checked against anything.
    const NpyArray& head() const { return head_; }
    /// Throws unless numbers of `numberSize` bytes in the shape of head() are just what there is.
    void requireSize(std::size_t numberSize) const;
    /// The next bytes of the numbers, as they lie in the file. Throws when there are not so many.
    void read(std::span<std::byte> bytes);
    /// Throws unless all has been read, and the archive's own sum is that of what was.
    void finish() const;

private:
    ZipMember member_;
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

private:
    Descriptor file_;
    std::uint64_t size_ = 0;
};

} // namespace storage
