// SPDX-License-Identifier: Apache-2.0
// Sources: J. Pineda, "A Parallel Algorithm for Polygon Rasterization", 1988: edge functions; J. Blinn and M. Newell,
// "Clipping Using Homogeneous Coordinates", 1978; P. Heckbert and H. Moreton, "Interpolation for Polygon Texture
// Mapping and Shading", 1991: colours divided by w.
#include "viewer/Raster.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <limits>
#include <tuple>
#include <utility>

namespace viewer {
namespace {

// Pixels are divided by 256. Whatever is farther from the middle of the picture than `guard` pixels is clipped, so that
// edge functions are below 2^52.
constexpr std::int64_t subpixels = 256;
constexpr double guard = 32768.0;
constexpr double leastW = 1e-20;
constexpr std::int64_t smallSide = 64 * subpixels; // edge functions of such triangles, and one step on, are below 2^31
constexpr float half = 0.5F;                       // to be rounded
using Values = std::array<float, 5>;

constexpr unsigned planeCount = 6;
constexpr std::uint8_t notFinite = 1U << planeCount;

bool areFinite(std::span<const float> numbers) {
    return std::all_of(numbers.begin(), numbers.end(), [](float number) { return std::isfinite(number); });
}

std::array<float, 4> times(const std::array<float, 16>& matrix, const std::array<float, 4>& v) {
    std::array<float, 4> result{};
    for (std::size_t row = 0; row < 4; ++row)
        result[row] = matrix[row] * v[0] + matrix[4 + row] * v[1] + matrix[8 + row] * v[2] + matrix[12 + row] * v[3];
    return result;
}

// towards the viewer where there is no direction
std::array<float, 3> turned(const std::array<float, 16>& view, const float* normal) {
    const auto n = times(view, {normal[0], normal[1], normal[2], 0.0F});
    const float length = std::sqrt(n[0] * n[0] + n[1] * n[1] + n[2] * n[2]);
    if (!(length > 0.0F && length < std::numeric_limits<float>::infinity()))
        return {0.0F, 0.0F, 1.0F};
    return {n[0] / length, n[1] / length, n[2] / length};
}

Colour scaled(const Colour& colour, float factor) {
    return {colour[0] * factor, colour[1] * factor, colour[2] * factor};
}

// each 0 to 255; what is no number is 0
std::uint32_t packed(const Colour& seen, bool isHeat) {
    const auto [red, green, blue] = isHeat ? scaled(heatColour(seen[0]), seen[1]) : seen;
    const auto byte = [](float value) {
        const float kept = value > 0.0F ? std::min(value, 255.0F) : 0.0F;
        return static_cast<std::uint32_t>(static_cast<std::int32_t>(kept + half));
    };
    return byte(red) | byte(green) << 8U | byte(blue) << 16U | 0xFF000000U;
}

// 0 for what is no number, and such that it can be multiplied
float shareOf(float error, float range) {
    const float share = error / range;
    return share > 0.0F ? std::min(share, 1e6F) : 0.0F;
}

// to the nearest: casts cut off, so what they get is made positive
std::int32_t subpixelOf(float pixel) {
    constexpr double shift = 4.0 * guard * subpixels + half;
    return static_cast<std::int32_t>(static_cast<double>(pixel) * subpixels + shift) - static_cast<std::int32_t>(shift);
}

// the first and the last pixel whose middle is not before, or behind, a place
std::int64_t firstCentre(std::int64_t subpixel) {
    return (subpixel + subpixels / 2 - 1) >> 8U;
}

std::int64_t lastCentre(std::int64_t subpixel) {
    return (subpixel - subpixels / 2) >> 8U;
}

template <class T>
T* allocated(std::size_t count) {
    return static_cast<T*>(std::malloc(count * sizeof(T)));
}

} // namespace

// Twice the area of a, b and a place: above 0 where it is to the right of the way from a to b as one sees it.
struct Raster::Edge {
    Edge(const Projected& a, const Projected& b)
        : dx(std::int64_t{b.x} - a.x)
        , dy(std::int64_t{b.y} - a.y)
        , x(a.x)
        , y(a.y)
        // what lies on an edge belongs to the triangle that has it on its left or on its top
        , bias(dy < 0 || (dy == 0 && dx > 0) ? 0 : -1) {}
    std::int64_t at(std::int64_t px, std::int64_t py) const { return dx * (py - y) - dy * (px - x); }

    std::int64_t dx, dy, x, y, bias;
};

// Pixels, all of them inside.
struct Raster::Box {
    std::int64_t left, right, top, bottom;
};

// A triangle that planes have been cut off: each adds a corner at most.
struct Raster::Polygon {
    void add(const Vertex& corner) {
        if (count < corners.size())
            corners[count++] = corner;
    }
    std::array<Vertex, 3 + planeCount> corners{};
    std::size_t count = 0;
};

void Raster::Free::operator()(void* memory) const {
    std::free(memory);
}

bool Raster::draw(const RasterFrame& frame, const RasterCamera& camera, const RasterSurface& surface) {
    const bool isFrame = frame.width >= 1 && frame.width <= mostPixels && frame.height >= 1 &&
                         frame.height <= mostPixels && frame.left <= frame.right && frame.right <= frame.width;
    if (!isFrame || !(surface.range > 0.0F) || !areFinite(camera.view) || !areFinite(camera.projection) ||
        !resize(frame))
        return false;
    clear();
    place(camera, surface);
    // what is turned away is hidden by then on most surfaces, and costs no colours
    backs_.clear();
    for (std::size_t corner = 0; corner + 3 <= surface.triangles.size(); corner += 3)
        if (isBack(&surface.triangles[corner]))
            backs_.push_back(corner);
        else
            drawTriangle(&surface.triangles[corner], false);
    for (const std::size_t corner : backs_)
        drawTriangle(&surface.triangles[corner], true);
    return true;
}

// what was there stays until there is memory for the new size
bool Raster::resize(const RasterFrame& frame) {
    if (pixels_ && frame.width == frame_.width && frame.height == frame_.height) {
        frame_ = frame;
        return true;
    }
    const std::size_t count = std::size_t{frame.width} * frame.height;
    Memory<std::uint32_t> pixels(allocated<std::uint32_t>(count));
    Memory<float> depths(allocated<float>(count));
    if (!pixels || !depths)
        return false;
    std::fill_n(pixels.get(), count, 0U);
    pixels_ = std::move(pixels);
    depths_ = std::move(depths);
    frame_ = frame;
    return true;
}

void Raster::clear() {
    for (std::size_t y = 0; y < frame_.height; ++y) {
        const std::size_t first = y * frame_.width + frame_.left;
        std::fill_n(&pixels_[first], frame_.right - frame_.left, 0U);
        std::fill_n(&depths_[first], frame_.right - frame_.left, 1.0F);
    }
}

void Raster::place(const RasterCamera& camera, const RasterSurface& surface) {
    isHeat_ = !surface.errors.empty();
    albedo_ = RasterLight::linear(surface.colour);
    placed_.resize(surface.points.size() / 3);
    for (std::size_t v = 0; v < placed_.size(); ++v) {
        const float* point = &surface.points[3 * v];
        const auto clip = times(camera.projection, times(camera.view, {point[0], point[1], point[2], 1.0F}));
        Placed& placed = placed_[v];
        placed.normal = turned(camera.view, &surface.normals[3 * v]);
        placed.heat = isHeat_ ? shareOf(surface.errors[v], surface.range) : 0.0F;
        placed.vertex = {clip[0], clip[1], clip[2], clip[3], colourOf(placed, 1.0F)};
        placed.hasBack = false;
        placed.outside = areFinite(clip) ? 0 : notFinite;
        for (unsigned plane = 0; plane < planeCount; ++plane)
            if (!(inside(placed.vertex, plane) >= 0.0))
                placed.outside |= static_cast<std::uint8_t>(1U << plane);
        if (placed.outside == 0 && !project(placed.vertex, placed.projected))
            placed.outside = notFinite;
    }
}

// `side` 1: the one that the normal is on; -1: the other. Of heat what each pixel has its colour from: the share of the
// range, and the light.
Colour Raster::colourOf(const Placed& placed, float side) const {
    const std::array<float, 3> normal{side * placed.normal[0], side * placed.normal[1], side * placed.normal[2]};
    return isHeat_ ? Colour{placed.heat, RasterLight::ofHeat(normal), 0.0F} : light_.lit(normal, albedo_);
}

const Colour& Raster::backOf(Placed& placed) const {
    if (!placed.hasBack)
        placed.back = colourOf(placed, -1.0F);
    placed.hasBack = true;
    return placed.back;
}

// How far inside of a plane, times something above 0. In double precision, as what is cut may be very large.
double Raster::inside(const Vertex& vertex, unsigned plane) const {
    const auto w = static_cast<double>(vertex.w);
    const double sideways = 2.0 * guard / static_cast<double>(plane < 4 ? frame_.width : frame_.height) * w;
    switch (plane) {
    case 0:
        return static_cast<double>(vertex.z) + w;
    case 1:
        return w - leastW;
    case 2:
        return sideways - static_cast<double>(vertex.x);
    case 3:
        return sideways + static_cast<double>(vertex.x);
    case 4:
        return sideways - static_cast<double>(vertex.y);
    default:
        return sideways + static_cast<double>(vertex.y);
    }
}

// whether the corners go round with the clock
bool Raster::isBack(const std::uint32_t* corners) const {
    const Placed& a = placed_[corners[0]];
    const Placed& b = placed_[corners[1]];
    const Placed& c = placed_[corners[2]];
    if ((a.outside | b.outside | c.outside) == 0)
        return Edge(a.projected, b.projected).at(c.projected.x, c.projected.y) > 0;
    // the volume that they span with the viewer is below 0
    const auto part = [](const Placed& one, const Placed& two, const Placed& three) {
        const auto [u, v, w] = std::tie(one.vertex, two.vertex, three.vertex);
        return static_cast<double>(u.w) * (static_cast<double>(v.x) * static_cast<double>(w.y) -
                                           static_cast<double>(v.y) * static_cast<double>(w.x));
    };
    return part(a, b, c) + part(b, c, a) + part(c, a, b) < 0.0;
}

void Raster::drawTriangle(const std::uint32_t* corners, bool isBack) {
    const std::array<Placed*, 3> placed{&placed_[corners[0]], &placed_[corners[1]], &placed_[corners[2]]};
    const unsigned any = placed[0]->outside | placed[1]->outside | placed[2]->outside;
    if ((any & notFinite) != 0 || (placed[0]->outside & placed[1]->outside & placed[2]->outside) != 0)
        return;
    if (any != 0) {
        Polygon polygon;
        for (Placed* corner : placed) {
            polygon.add(corner->vertex);
            if (isBack)
                polygon.corners[polygon.count - 1].colour = backOf(*corner);
        }
        return drawClipped(polygon, any);
    }
    std::array<Projected, 3> seen{placed[0]->projected, placed[1]->projected, placed[2]->projected};
    for (std::size_t i = 0; isBack && i < seen.size(); ++i) {
        const Colour back = scaled(backOf(*placed[i]), seen[i].values[1]);
        std::copy(back.begin(), back.end(), &seen[i].values[2]);
    }
    fill(seen);
}

void Raster::drawClipped(Polygon polygon, unsigned planes) {
    for (unsigned plane = 0; plane < planeCount; ++plane)
        if ((planes >> plane & 1U) != 0)
            polygon = clipped(polygon, plane);
    for (std::size_t i = 2; i < polygon.count; ++i) {
        std::array<Projected, 3> seen{};
        if (project(polygon.corners[0], seen[0]) && project(polygon.corners[i - 1], seen[1]) &&
            project(polygon.corners[i], seen[2]))
            fill(seen);
    }
}

Raster::Polygon Raster::clipped(const Polygon& polygon, unsigned plane) const {
    Polygon kept;
    for (std::size_t i = 0; i < polygon.count; ++i) {
        const Vertex& from = polygon.corners[i];
        const Vertex& to = polygon.corners[(i + 1) % polygon.count];
        const double here = inside(from, plane);
        const double there = inside(to, plane);
        if (here >= 0.0)
            kept.add(from);
        // from the inner end on, so that both triangles at an edge get the same point
        if (here >= 0.0 && there < 0.0)
            kept.add(between(from, to, here / (here - there)));
        else if (here < 0.0 && there >= 0.0)
            kept.add(between(to, from, there / (there - here)));
    }
    return kept;
}

Raster::Vertex Raster::between(const Vertex& from, const Vertex& to, double share) {
    const auto mix = [share](double a, double b) { return static_cast<float>(a + share * (b - a)); };
    Vertex made{mix(from.x, to.x), mix(from.y, to.y), mix(from.z, to.z), mix(from.w, to.w), {}};
    for (std::size_t channel = 0; channel < made.colour.size(); ++channel)
        made.colour[channel] = mix(from.colour[channel], to.colour[channel]);
    return made;
}

bool Raster::project(const Vertex& vertex, Projected& projected) const {
    constexpr auto mostPixel = static_cast<float>(2.0 * guard);
    const float q = 1.0F / vertex.w;
    const float x = (0.5F + 0.5F * vertex.x * q) * static_cast<float>(frame_.width);
    const float y = (0.5F - 0.5F * vertex.y * q) * static_cast<float>(frame_.height);
    if (!(vertex.w > 0.0F && std::abs(x) <= mostPixel && std::abs(y) <= mostPixel))
        return false;
    projected.x = subpixelOf(x);
    projected.y = subpixelOf(y);
    projected.values = {vertex.z * q, q, vertex.colour[0] * q, vertex.colour[1] * q, vertex.colour[2] * q};
    return true;
}

void Raster::fill(std::array<Projected, 3> p) {
    std::int64_t area = Edge(p[0], p[1]).at(p[2].x, p[2].y);
    if (area == 0)
        return;
    if (area < 0) {
        std::swap(p[1], p[2]);
        area = -area;
    }
    const auto [leastX, mostX] = std::minmax({p[0].x, p[1].x, p[2].x});
    const auto [leastY, mostY] = std::minmax({p[0].y, p[1].y, p[2].y});
    const Box box{std::max<std::int64_t>(firstCentre(leastX), frame_.left),
                  std::min<std::int64_t>(lastCentre(mostX), std::int64_t{frame_.right} - 1),
                  std::max<std::int64_t>(firstCentre(leastY), 0),
                  std::min<std::int64_t>(lastCentre(mostY), std::int64_t{frame_.height} - 1)};
    if (box.left > box.right || box.top > box.bottom)
        return;
    if (std::max(mostX - leastX, mostY - leastY) < smallSide)
        fillBox<std::int32_t>(p, area, box);
    else
        fillBox<std::int64_t>(p, area, box);
}

template <class Number>
void Raster::fillBox(const std::array<Projected, 3>& p, std::int64_t area, const Box& box) {
    // the weight of a corner is the edge function of the side across from it
    const std::array<Edge, 3> sides{Edge(p[1], p[2]), Edge(p[2], p[0]), Edge(p[0], p[1])};
    const std::int64_t x = box.left * subpixels + subpixels / 2;
    const std::int64_t y = box.top * subpixels + subpixels / 2;
    std::array<Number, 3> row{}, right{}, down{}, bias{};
    for (std::size_t i = 0; i < sides.size(); ++i) {
        row[i] = static_cast<Number>(sides[i].at(x, y));
        right[i] = static_cast<Number>(-sides[i].dy * subpixels);
        down[i] = static_cast<Number>(sides[i].dx * subpixels);
        bias[i] = static_cast<Number>(sides[i].bias);
    }
    const float perArea = 1.0F / static_cast<float>(area);
    Values atA{}, atB{}, atC{};
    for (std::size_t i = 0; i < atA.size(); ++i) {
        atA[i] = p[0].values[i] * perArea;
        atB[i] = p[1].values[i] * perArea;
        atC[i] = p[2].values[i] * perArea;
    }
    const std::int64_t columns = box.right - box.left + 1;
    for (std::int64_t line = box.top; line <= box.bottom; ++line) {
        Number ea = row[0];
        Number eb = row[1];
        Number ec = row[2];
        const std::int64_t first = line * frame_.width + box.left;
        float* depths = &depths_[static_cast<std::size_t>(first)];
        std::uint32_t* pixels = &pixels_[static_cast<std::size_t>(first)];
        for (std::int64_t column = 0; column < columns; ++column) {
            if (((ea + bias[0]) | (eb + bias[1]) | (ec + bias[2])) >= 0) {
                const auto a = static_cast<float>(ea);
                const auto b = static_cast<float>(eb);
                const auto c = static_cast<float>(ec);
                const auto value = [&](std::size_t i) { return a * atA[i] + b * atB[i] + c * atC[i]; };
                if (const float depth = value(0); depth < depths[column]) {
                    const float w = 1.0F / value(1);
                    depths[column] = depth;
                    pixels[column] = packed({value(2) * w, value(3) * w, value(4) * w}, isHeat_);
                }
            }
            ea += right[0];
            eb += right[1];
            ec += right[2];
        }
        for (std::size_t i = 0; i < row.size(); ++i)
            row[i] += down[i];
    }
}

} // namespace viewer
