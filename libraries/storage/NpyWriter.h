// SPDX-License-Identifier: Apache-2.0
// Point caches, written: what numpy.load reads.
#pragma once

#include "storage/WholeFile.h"

#include <cstddef>
#include <span>
#include <string>

namespace storage {

/// Writes an array of [frames, vertices, 3] '<f4', frame by frame, as a WholeFile: finish() puts it into its
/// place, and without it nothing is left. Errors are FileError; after one, only destruction is left. One
/// thread at a time. [any] throughout.
class NpyWriter {
public:
    /// Makes the temporary file. Throws when the file could not be put into its place.
    NpyWriter(const std::string& path, std::size_t vertexCount);

    /// Adds a frame: `xyz` x, y, z of every vertex, 3 * vertexCount numbers. Throws std::invalid_argument, and writes
    /// nothing, for another number of them; std::runtime_error, naming frame and vertex, for one that is not finite.
    void append(std::span<const float> xyz);
    /// Of those that have been written.
    std::size_t frameCount() const { return frames_; }
    /// Writes the header, brings everything to the disk and puts the file into its place. Called once.
    void finish();

private:
    void beginStep();

    std::string path_;
    WholeFile file_;
    std::size_t vertexCount_;
    std::size_t frames_ = 0;
    bool isUsable_ = true;
};

} // namespace storage
