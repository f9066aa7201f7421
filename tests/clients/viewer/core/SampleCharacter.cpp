// SPDX-License-Identifier: Apache-2.0
#include "clients/viewer/core/SampleCharacter.h"

#include "viewer/Character.h"

#include <algorithm>
#include <fstream>
#include <iterator>
#include <numeric>
#include <span>

namespace {

using Words = std::vector<std::uint32_t>;

constexpr std::uint32_t matrixCount = 6, jointCount = 5, sliderCount = 6, blendShapeCount = 5, freeValueCount = 3,
                        converterCount = 4;
constexpr std::uint32_t none = 0xFFFFFFFF;

} // namespace

SampleCharacter::SampleCharacter(const SampleOptions& options)
    : options_(options)
    , state_(options.seed)
    , mesh_(shuffled(options.grid != 0 ? makeGrid(options.grid, options.grid) : makeIcosphere(options.subdivisions),
                     options.seed))
    , n_(mesh_.vertexCount())
    , slots_(options.isPartial ? n_ / 3 : n_) {
    const bool hasRig = options.hasRig && !options.takesPoints;
    put("settings",
        Words{1, static_cast<std::uint32_t>(n_), options.deltaMode, options.passes, options.shapes,
              static_cast<std::uint32_t>(slots_), options.controls, options.frames, options.takesPoints ? 1U : 0U,
              options.takesPoints ? 0 : matrixCount, hasRig ? jointCount : 0, hasRig ? sliderCount : 0,
              options.takesPoints ? 0 : blendShapeCount, hasRig ? freeValueCount : 0, hasRig ? converterCount : 0, 0});
    addMesh();
    addModel();
    if (!options.takesPoints)
        addSkin();
    if (hasRig)
        addRig();
    addMotion();
}

// Knuth's MMIX generator, of whose state the upper bits are taken: the same numbers everywhere
std::vector<double> SampleCharacter::randoms(std::size_t count, double least, double most) {
    std::vector<double> values(count);
    for (double& value : values) {
        state_ = state_ * 6364136223846793005U + 1442695040888963407U;
        value = least + (most - least) * static_cast<double>(state_ >> 33U) / 2147483648.0;
    }
    return values;
}

std::uint32_t SampleCharacter::below(std::size_t end) {
    return static_cast<std::uint32_t>(randoms(1, 0.0, static_cast<double>(end))[0]);
}

std::vector<double> SampleCharacter::matrices(std::size_t count) {
    std::vector<double> values = randoms(16 * count, -0.3, 0.3);
    for (std::size_t i = 0; i < values.size(); ++i)
        if (i % 16 % 5 == 0)
            values[i] += 1.0;
    for (std::size_t i = 0; i < count; ++i)
        for (std::size_t row = 0; row < 4; ++row)
            values[16 * i + 4 * row + 3] = row == 3 ? 1.0 : 0.0;
    return values;
}

void SampleCharacter::addMesh() {
    Words sizes, corners;
    for (const std::vector<std::uint32_t>& polygon : mesh_.polygons) {
        sizes.push_back(static_cast<std::uint32_t>(polygon.size()));
        corners.insert(corners.end(), polygon.begin(), polygon.end());
    }
    std::vector<float> rest;
    for (const auto& p : mesh_.points)
        rest.insert(rest.end(), {p.x, p.y, p.z});
    put("mesh.sizes", sizes);
    put("mesh.corners", corners);
    put("mesh.rest", rest);
    put("scale", std::vector<double>{1000.0});
    if (!options_.hasSeams)
        return;
    Words drawn(n_ + n_ / 4), drawCorners = corners;
    std::iota(drawn.begin(), drawn.end(), 0U);
    for (std::size_t i = n_; i < drawn.size(); ++i)
        drawn[i] = static_cast<std::uint32_t>(i - n_); // the second of the first vertices
    for (std::uint32_t& corner : drawCorners)
        if (corner < drawn.size() - n_ && below(2) == 1)
            corner += static_cast<std::uint32_t>(n_);
    put("draw.vertices", drawn);
    put("draw.corners", drawCorners);
}

void SampleCharacter::addModel() {
    if (options_.isPartial) {
        Words vertices(n_);
        std::iota(vertices.begin(), vertices.end(), 0U);
        for (std::size_t i = 0; i < slots_; ++i) // some of them, in any order
            std::swap(vertices[i], vertices[i + below(n_ - i)]);
        vertices.resize(slots_);
        put("model.vertices", vertices);
    }
    if (options_.hasWeights) {
        const std::vector<double> weights = randoms(n_, 0.0, 1.0);
        put("weights", std::vector<float>(weights.begin(), weights.end()));
    }
    addNetwork(options_.shapes != 0 ? options_.shapes : 3 * slots_);
    const std::size_t most = options_.basisBytes == 1 ? 127 : 32767;
    std::vector<float> scales;
    for (const double scale : randoms(options_.shapes, 0.01, 0.05))
        scales.push_back(static_cast<float>(scale / static_cast<double>(most)));
    const std::vector<double> drawn =
        randoms(3 * slots_ * options_.shapes, -static_cast<double>(most), static_cast<double>(most));
    const std::vector<std::int16_t> numbers(drawn.begin(), drawn.end());
    for (std::size_t i = 0; i < numbers.size(); ++i)
        basis_.push_back(scales[i / 3 % options_.shapes] * static_cast<float>(numbers[i]));
    if (options_.shapes == 0)
        return;
    if (options_.basisBytes == 4)
        put("basis.values", basis_);
    else if (options_.basisBytes == 2)
        put("basis.values", numbers);
    else
        put("basis.values", std::vector<std::int8_t>(numbers.begin(), numbers.end()));
    put("basis.scales", scales);
}

void SampleCharacter::addNetwork(std::size_t outputs) {
    constexpr std::uint32_t matmul = 1, add = 2, tanh = 11, sigmoid = 12;
    const std::uint32_t curve = options_.hidden % 2 == 0 ? tanh : sigmoid;
    const auto c = options_.controls, hidden = options_.hidden, out = static_cast<std::uint32_t>(outputs);
    if (hidden != 0) {
        const std::vector<double> weights = randoms(std::size_t{hidden} * (c + outputs), -0.5, 0.5);
        put("network.constants", std::vector<float>(weights.begin(), weights.end()));
        put("network.words",
            Words{1,      4, c,      out, 3,    3,          c,          hidden,       hidden, out, // widths
                  matmul, 0, none,   1,   0,    c * hidden, 0,          curve,        1,      none, 2, 0,
                  0,      0, matmul, 2,   none, 3,          c * hidden, hidden * out, 0});
        return;
    }
    std::vector<float> constants(std::size_t{c} * outputs + outputs); // and a bias of zeros
    for (std::size_t i = 0; i < outputs; ++i)
        constants[i % c * outputs + i] = options_.shapes != 0 ? 1.5F : 0.02F;
    put("network.constants", constants);
    put("network.words", Words{1,      3, c,    out, 2, 2,       c, out, out, // widths
                               matmul, 0, none, 1,   0, c * out, 0, add, 1,   none, 2, c * out, out, 0});
}

void SampleCharacter::addSkin() {
    const std::vector<double> points = randoms(3 * n_, -1.0, 1.0);
    Words counts, influences;
    std::vector<double> weights;
    for (std::size_t v = 0; v < n_; ++v) {
        counts.push_back(v % 17 == 0 ? 0 : 1 + below(4));
        for (const double weight : randoms(counts.back(), 0.1, 1.0)) {
            influences.push_back((below(matrixCount - 4) + static_cast<std::uint32_t>(influences.size())) %
                                 matrixCount);
            weights.push_back(weight / counts.back());
        }
    }
    put("skin.points", points);
    put("skin.counts", counts);
    put("skin.influences", influences);
    put("skin.weights", weights);
    Words shapeCounts, vertices;
    for (std::uint32_t shape = 0; shape < blendShapeCount; ++shape) {
        const std::size_t before = vertices.size();
        for (std::uint32_t v = 0; v < n_; ++v)
            if (below(3) == 0)
                vertices.push_back(v);
        shapeCounts.push_back(static_cast<std::uint32_t>(vertices.size() - before));
    }
    put("shapes.counts", shapeCounts);
    put("shapes.vertices", vertices);
    put("shapes.deltas", randoms(3 * vertices.size(), -0.1, 0.1));
}

void SampleCharacter::addRig() {
    std::vector<std::int32_t> parents;
    std::vector<double> channels, spaces;
    for (std::size_t i = 0; i < jointCount; ++i) {
        parents.push_back(i == 0 ? -1 : static_cast<std::int32_t>(below(i + 1)) - 1);
        const std::vector<double> moved = randoms(9, -1.5, 1.5), scaled = randoms(3, 0.5, 1.5);
        channels.insert(channels.end(), moved.begin(), moved.end());
        channels.insert(channels.end(), scaled.begin(), scaled.end());
        const std::vector<double> space =
            parents[i] < 0 ? matrices(1) : std::vector<double>{1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};
        spaces.insert(spaces.end(), space.begin(), space.end());
    }
    put("rig.parents", parents);
    put("rig.orders", Words{below(6), below(6), below(6), below(6), below(6)});
    put("rig.channels", channels);
    put("rig.rest", matrices(jointCount));
    put("rig.space", spaces);
    put("rig.values", randoms(freeValueCount, 0.0, 1.0));
    put("rig.sliders", Words{0, 3, 1, 4, jointCount - 1, 5, none, 0, none, 1, 2, 0});
    put("rig.limits", randoms(std::size_t{3} * sliderCount, -1.0, 1.0));
    put("rig.animated", Words{3, 5, none, 2});
    put("frames.animated", randoms(std::size_t{2} * options_.frames, 0.1, 1.0));
    put("rig.constants", std::vector<double>{0.25});
    // Euler, a quaternion, two axes and scales, three axes and places; the switches of axes at random
    Words converters;
    for (const std::uint32_t word : {1U, 1U, 3U, 5U})
        converters.insert(converters.end(),
                          {word | (below(512) << 3U), static_cast<std::uint32_t>(converters.size() / 2)});
    converters[0] |= 8U; // one angle at least
    put("rig.converters", converters);
    Words controls;
    const Words first{0, 0, 0, 0,        0, 2, 1, 0, below(3), 0, 2, 2, 3, below(3), 1, 2, 3, 5, below(3), 2,
                      2, 4, 8, below(3), 3, 1, 1, 4, below(3), 0, 3, 1, 0, 0,        0, 4, 2, 7, 0,        0};
    for (std::size_t i = 0; i < options_.controls; ++i)
        for (std::size_t word = 0; word < 5; ++word)
            controls.push_back(first[(5 * i + word) % first.size()]);
    put("rig.controls", controls);
    put("rig.weights", Words{0, none, 1, none, none}); // products, and one of no weight
    put("rig.factorCounts", Words{0, 2, 0, 1, 0});
    put("rig.factors", Words{0, 2, 2});
    put("rig.ramps", std::vector<double>{0.0, 0.5, 1.5, -0.5, 0.25, 2.0, -1.0, 1.0, 1.0});
    put("skin.joints", Words{2, 0, none, 1, 4, 3});
    put("skin.binds", matrices(matrixCount));
}

void SampleCharacter::addMotion() {
    const std::size_t frames = options_.frames;
    const auto floats = [&](const std::string& name, std::size_t count, double least, double most) {
        const std::vector<double> values = randoms(count, least, most);
        put(name, std::vector<float>(values.begin(), values.end()));
    };
    floats("frames.controls", frames * options_.controls, -1.0, 1.0);
    if (options_.hasEnvelope)
        floats("frames.envelope", frames, 0.1, 1.2);
    if (options_.takesPoints) {
        floats("frames.points", 3 * frames * n_, -1.0, 1.0);
    } else {
        floats("frames.matrices", 12 * frames * matrixCount, -1.0, 1.0);
        put("frames.weights", randoms(frames * blendShapeCount, 0.0, 1.0));
        if (options_.hasRig)
            put("frames.sliders", randoms(frames * sliderCount, -1.0, 1.0));
    }
    const std::vector<double> target = randoms(3 * frames * n_, -32768.0, 32767.0);
    if (options_.hasTargetPoints) {
        put("target.points", std::vector<std::int16_t>(target.begin(), target.end()));
        put("target.box", std::vector<double>{-1.0, -2.0, -1.5, 2.0, 4.0, 3.0});
        return;
    }
    for (const char* const name : {"errors.before", "errors.after"}) {
        const std::vector<double> errors = randoms(frames * n_, 0.0, 255.99);
        put(name, std::vector<std::uint8_t>(errors.begin(), errors.end()));
    }
    put("errors.range", std::vector<double>{5.0});
}

viewer::Blocks SampleCharacter::blocks() const {
    viewer::Blocks blocks;
    for (const auto& [name, bytes] : bytes_)
        blocks.add(name, bytes);
    return blocks;
}

void SampleCharacter::addChecks(const std::vector<std::uint32_t>& frames) {
    viewer::Character character(blocks());
    std::vector<std::uint64_t> sums;
    for (const std::uint32_t frame : frames) {
        character.showFrame(frame);
        sums.push_back(character.sum());
    }
    put("check.frames", frames);
    put("check.sums", sums);
}

void SampleCharacter::write(const std::filesystem::path& folder) const {
    std::filesystem::create_directories(folder);
    for (const auto& [name, bytes] : bytes_) {
        std::ofstream file(folder / name, std::ios::binary);
        // NOLINTNEXTLINE(cppcoreguidelines-pro-type-reinterpret-cast): bytes are written
        file.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
    }
}
