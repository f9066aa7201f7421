// SPDX-License-Identifier: Apache-2.0
// Point caches: the points of a mesh, frame by frame, in a file. docs/pointCache.md has the formats.
#pragma once

#include "storage/CacheFormat.h"
#include "storage/CacheLayout.h"
#include "storage/Descriptor.h"
#include "storage/FileIdentity.h"

#include <cstddef>
#include <memory>
#include <optional>
#include <span>
#include <string>

namespace storage {

/// A point cache, open for reading. Positions are as the file has them: their space and unit are the file's. Nothing of
/// it is kept in memory but its shape. Errors are std::runtime_error with a sentence that names the path and the
/// reason. Several threads may read at the same time. [any] throughout.
class PointCache {
public:
    /// Opens the file, and checks all of it but the values: afterwards every frame lies within the file. Throws when it
    /// cannot be opened, or is none of the format.
    PointCache(const std::string& path, CacheFormat format);
    PointCache(const PointCache&) = delete;
    PointCache& operator=(const PointCache&) = delete;

    const std::string& path() const { return path_; }
    CacheFormat format() const { return format_; }
    /// Of the file as it was opened; that of no file for a sequence of files.
    const FileIdentity& identity() const { return identity_; }
    std::size_t frameCount() const { return layout_.frames; }    ///< may be 0
    std::size_t vertexCount() const { return layout_.vertices; } ///< of each frame; may be 0

    /// When a frame is, in seconds; none where the format has no times: only MDD has. Throws as read() does, and when
    /// the time is no finite number.
    std::optional<double> secondsOf(std::size_t frame) const;
    /// The number of the first frame, and the frames from one to the next, as the head or the names of the files say
    /// them; both finite. None where the format has none: only PC2 and a sequence of OBJ files have.
    std::optional<double> firstFrame() const { return layout_.firstFrame; }
    std::optional<double> frameStep() const { return layout_.frameStep; }

    /// Reads points of one frame: `xyz.size() / 3` of them from vertex `firstVertex` on, as x, y, z one after the
    /// other. `xyz` a multiple of 3 long; overwritten, also when reading fails. Values are as they are in the file,
    /// which includes those that are no number. Throws when the disk fails or the file has been cut short since it was
    /// opened; std::out_of_range when there are no such points.
    void read(std::size_t frame, std::size_t firstVertex, std::span<double> xyz) const;

private:
    void readBytes(const FileBytes& from, std::uint64_t place, std::span<std::byte> bytes) const;
    void readSingles(std::uint64_t place, std::span<double> xyz) const;
    [[noreturn]] void fail(const std::string& why) const;

    std::string path_;
    CacheFormat format_;
    Descriptor file_;
    FileIdentity identity_;
    CacheLayout layout_;
};

/// Opens a cache in the format of its name's ending. Throws as PointCache does, and, naming the endings that are read,
/// for another one. [any]
std::unique_ptr<PointCache> openPointCache(const std::string& path);

} // namespace storage
