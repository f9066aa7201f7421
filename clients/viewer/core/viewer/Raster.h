// SPDX-License-Identifier: Apache-2.0
// Pictures of a surface where a page has no WebGL2: triangles with a depth for each pixel, on one core.
//
// Camera space: x to the right, y up, the viewer looks along -z. All matrices are column-major, for column vectors, as
// `elements` of three.js' Matrix4 is.
#pragma once

#include "viewer/RasterLight.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

namespace viewer {

struct RasterCamera {
    std::array<float, 16> view;       ///< from the surface's space to the camera's: affine
    std::array<float, 16> projection; ///< from there to clip space: what is in sight has -w <= x, y, z <= w
};

/// Which pixels are drawn: all rows of columns `left` to `right` - 1.
struct RasterFrame {
    std::uint32_t width = 0, height = 0; ///< of the picture; 1 to Raster::mostPixels each
    std::uint32_t left = 0, right = 0;   ///< left <= right <= width
};

/// What is drawn; the arrays are the caller's and are not kept.
struct RasterSurface {
    std::span<const float> points;            ///< [d][3]; a triangle with one that is not finite is left out
    std::span<const float> normals;           ///< [d][3], of any length; both sides of a triangle are lit
    std::span<const std::uint32_t> triangles; ///< [t][3], below d: not checked
    std::span<const float> errors = {};       ///< [d], heat from 0 to `range`; empty: all of it has `colour`
    float range = 1.0F;                       ///< above 0, in the unit of the errors
    Colour colour{};                          ///< sRGB, 0 to 1
};

/// A picture that is kept from one drawing to the next. The same numbers give the same picture. Thread: one at a time.
class Raster {
public:
    static constexpr std::uint32_t mostPixels = 8192; ///< along one side

    /// Clears the columns of `frame` and draws them; the others stay as they were, or are empty where the size is
    /// another one than before. Allocates for a new size, and for more vertices than ever before. False, and nothing
    /// is drawn, for a frame that is none, a range that is not above 0, matrices that are not finite, and a size that
    /// there is no memory for.
    bool draw(const RasterFrame& frame, const RasterCamera& camera, const RasterSurface& surface);

    /// [height][width][4], rows from the top: red, green and blue in sRGB, and 255 where there is surface, 0 where
    /// there is none. Until the next draw(); null before the first.
    const std::uint8_t* rgba() const { return reinterpret_cast<const std::uint8_t*>(pixels_.get()); }

private:
    struct Free {
        void operator()(void* memory) const;
    };
    template <class T>
    using Memory = std::unique_ptr<T[], Free>;

    /// In clip space, with its colour in sRGB, 0 to 255; see colourOf().
    struct Vertex {
        float x, y, z, w;
        Colour colour;
    };
    /// Where it is on the screen: subpixels, y down; and what is linear between corners there: depth, 1 / w, and the
    /// colour divided by w.
    struct Projected {
        std::int32_t x, y;
        std::array<float, 5> values;
    };
    /// A vertex of the surface. Its far side has no colour until it is asked for.
    struct Placed {
        Vertex vertex;
        Projected projected; ///< where it is beyond no plane
        Colour back;
        std::array<float, 3> normal; ///< in camera space, of length 1
        float heat;                  ///< share of the range
        std::uint8_t outside;        ///< planes that it is beyond, a bit each
        bool hasBack;
    };
    struct Polygon;
    struct Edge;
    struct Box;

    bool resize(const RasterFrame& frame);
    void clear();
    void place(const RasterCamera& camera, const RasterSurface& surface);
    Colour colourOf(const Placed& placed, float side) const;
    const Colour& backOf(Placed& placed) const;
    double inside(const Vertex& vertex, unsigned plane) const;
    bool isBack(const std::uint32_t* corners) const;
    void drawTriangle(const std::uint32_t* corners, bool isBack);
    void drawClipped(Polygon polygon, unsigned planes);
    Polygon clipped(const Polygon& polygon, unsigned plane) const;
    static Vertex between(const Vertex& from, const Vertex& to, double share);
    bool project(const Vertex& vertex, Projected& projected) const;
    void fill(std::array<Projected, 3> corners);
    template <class Number>
    void fillBox(const std::array<Projected, 3>& corners, std::int64_t area, const Box& box);

    RasterLight light_;
    RasterFrame frame_; ///< of the last draw(), as what follows
    bool isHeat_ = false;
    Colour albedo_{}; ///< linear
    Memory<std::uint32_t> pixels_;
    Memory<float> depths_; ///< z / w of what is seen; 1, the far plane, where nothing is
    std::vector<Placed> placed_;
    std::vector<std::size_t> backs_; ///< first corners of triangles that are turned away
};

} // namespace viewer
