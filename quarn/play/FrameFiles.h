// SPDX-License-Identifier: Apache-2.0
// Played frames on the disk: a point cache of all of them, or a mesh file of each.
#pragma once

#include "quarn/play/VertexOrder.h"
#include "quarn/scene/frames.h"
#include "quarn/scene/meshes.h"

#include <filesystem>
#include <memory>
#include <span>
#include <string>

namespace storage {
class NpyWriter;
}

namespace quarn {

/// The file name of a frame: the run of "#" in the last part of `pattern` becomes the number, padded with zeros to as
/// many digits ("-0012" for -12). A pattern without "#" comes back as it is.
std::filesystem::path frameFile(const std::filesystem::path& pattern, int frame);

/// Throws std::runtime_error when the ending is none that is written, and for a mesh file without "#" where there are
/// several frames. Before anything is played.
void checkFramePattern(const std::filesystem::path& pattern, const FrameRange& frames);

/// Every file is there as a whole or not at all; of a point cache nothing is left without finish(). Thread: main.
class FrameFiles {
public:
    /// `polygons` of the scene's mesh.
    FrameFiles(std::filesystem::path pattern, const MeshPolygons& polygons, VertexOrder order);
    ~FrameFiles();
    FrameFiles(const FrameFiles&) = delete;
    FrameFiles& operator=(const FrameFiles&) = delete;

    /// `xyz` in the scene's order. Throws std::runtime_error that names the file.
    void add(int frame, std::span<const float> xyz);
    void finish();

private:
    std::filesystem::path pattern_;
    VertexOrder order_;
    MeshPolygons polygons_; ///< only for mesh files
    std::unique_ptr<storage::NpyWriter> cache_;
};

} // namespace quarn
