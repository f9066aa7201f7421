// SPDX-License-Identifier: Apache-2.0
// Point caches, written.
#pragma once

#include "storage/WholeFile.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>

namespace storage {

/// Writes a point cache frame by frame, in single precision, as a WholeFile: finish() puts it into its place, and
/// without it nothing is left. Errors are FileError; after one, only destruction is left. One thread at a time. [any]
/// throughout.
class PointCacheWriter {
public:
    virtual ~PointCacheWriter();
    PointCacheWriter(const PointCacheWriter&) = delete;
    PointCacheWriter& operator=(const PointCacheWriter&) = delete;

    /// Adds a frame: `xyz` x, y, z of every vertex, 3 * vertexCount numbers. Throws std::invalid_argument, and writes
    /// nothing, for another number of them; std::runtime_error, naming frame and vertex, for one that is not finite.
    void append(std::span<const float> xyz);
    std::size_t vertexCount() const { return vertexCount_; }
    /// Of those that have been written.
    std::size_t frameCount() const { return frames_; }
    /// Writes the head, brings everything to the disk and puts the file into its place. Called once.
    void finish();

protected:
    /// Makes the temporary file, and leaves `headSize` bytes free. Throws when the file could not be put into its
    /// place.
    PointCacheWriter(const std::string& path, std::size_t vertexCount, std::size_t headSize);

    /// What the format has around the points of all frames.
    struct Frame {
        std::string before, behind; ///< `before` of headSize bytes
    };

private:
    /// For the frames that have been appended.
    virtual Frame frame() const = 0;
    /// Brings the numbers of a frame into the file.
    virtual void writePoints(WholeFile& file, std::span<const float> xyz);
    void beginStep();

    std::string path_;
    WholeFile file_;
    std::size_t vertexCount_;
    std::size_t frames_ = 0;
    bool isUsable_ = true;
};

/// When the frames of a cache are. Formats without room for it do not keep it.
struct CacheTiming {
    std::size_t frameCount = 0; ///< of all frames that are going to be appended
    double firstFrame = 1.0;
    double frameStep = 1.0;        ///< from one to the next
    double framesPerSecond = 24.0; ///< above 0; second 0 is frame 0
};

/// Writes a cache in the format of its name's ending. Throws FileError when the file could not be put into its place;
/// std::runtime_error, with the path, for another ending and for more vertices or frames than the format can say.
/// A cache gets exactly timing.frameCount frames: finish() throws std::logic_error otherwise, in a format that depends
/// on it.
std::unique_ptr<PointCacheWriter> createPointCache(const std::string& path, std::size_t vertexCount,
                                                   const CacheTiming& timing);

} // namespace storage
