// SPDX-License-Identifier: Apache-2.0
// A moving mesh as a layer of USD, in text.
#pragma once

#include "quarn/play/AnimatedFile.h"
#include "storage/WholeFile.h"

#include <array>
#include <vector>

namespace quarn {

/// One prim of type Mesh, whose points and extent are time samples; a time code is a frame. Frames are written as they
/// come, none is kept. Coordinates have nine digits, which read back as the same single-precision numbers.
class UsdFile : public AnimatedFile {
public:
    /// `polygons` are only read here.
    UsdFile(const std::filesystem::path& path, const MeshPolygons& polygons, ClipMotion motion);

    std::uint64_t expectedBytes() const override;
    void add(int frame, std::span<const float> xyz) override;
    void finish() override;

private:
    using Box = std::array<float, 6>; ///< the lowest corner, and the highest

    void writeHead(const MeshPolygons& polygons);

    storage::WholeFile file_;
    ClipMotion motion_;
    std::size_t vertexCount_;
    std::uint64_t uvBytes_;
    std::vector<int> frames_;
    std::vector<Box> boxes_; ///< of each frame
    std::string line_;
};

/// A text as the name of a prim: letters, digits and "_", no digit in front. Never empty.
std::string primName(const std::string& text);

} // namespace quarn
