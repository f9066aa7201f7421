// SPDX-License-Identifier: Apache-2.0
// Point caches: the points of a mesh, frame by frame, in a NumPy array file. What numpy.save writes is read.
#pragma once

#include "storage/Descriptor.h"
#include "storage/npyHeader.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>

namespace storage {

/// Tells a file from another in its place, or from itself after it was written again.
struct FileIdentity {
    std::uint64_t device = 0;
    std::uint64_t inode = 0;
    std::uint64_t size = 0;
    std::int64_t seconds = 0; ///< of the last change, with the nanoseconds
    std::int64_t nanoseconds = 0;
    bool operator==(const FileIdentity&) const = default;
};

/// Of what is at `path` now; none when nothing is, or it cannot be told. [any]
std::optional<FileIdentity> identityOf(const std::string& path);

/// An array of [frames, vertices, 3] or [vertices, 3] numbers, '<f4' or '<f8' in C order, open for reading. Nothing of
/// the file is kept but its shape. Errors are std::runtime_error with a sentence that names the path and the reason.
/// Several threads may read at the same time. [any] throughout.
class NpyFile {
public:
    /// Opens the file, and checks all of it but the values: afterwards every frame lies within the file. Throws when
    /// it cannot be opened, or is none of the kind.
    explicit NpyFile(const std::string& path);

    const std::string& path() const { return path_; }
    const FileIdentity& identity() const { return identity_; }
    std::size_t frameCount() const { return header_.frames; }    ///< may be 0
    std::size_t vertexCount() const { return header_.vertices; } ///< of each frame; may be 0

    /// Reads points of one frame: `xyz.size() / 3` of them from vertex `firstVertex` on, as x, y, z one after the
    /// other. `xyz` a multiple of 3 long; overwritten, also when reading fails. Values are as they are in the file,
    /// which includes those that are no number. Throws when the disk fails or the file has been cut short since it was
    /// opened; std::out_of_range when there are no such points.
    void read(std::size_t frame, std::size_t firstVertex, std::span<double> xyz) const;

private:
    template <class Parse>
    auto parsed(Parse parse) const;
    void readHeader();
    void checkSize() const;
    void readBytes(std::uint64_t from, std::span<std::byte> bytes) const;
    [[noreturn]] void fail(const std::string& why) const;

    std::string path_;
    Descriptor file_;
    FileIdentity identity_;
    NpyHeader header_;
};

} // namespace storage
