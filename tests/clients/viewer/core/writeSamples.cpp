// SPDX-License-Identifier: Apache-2.0
// writeSamples FOLDER: characters made at random, a folder each, with their blocks and with what the native build makes
// of them. For viewer.mjs, which compares.
#include "clients/viewer/core/SampleCharacter.h"
#include "viewer/Character.h"

#include <fstream>
#include <iomanip>
#include <iostream>
#include <span>

namespace {

namespace fs = std::filesystem;
using viewer::Character;
using viewer::Shape;

void writeBytes(const fs::path& path, std::span<const std::byte> bytes) {
    std::ofstream file(path, std::ios::binary);
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-reinterpret-cast): bytes are written
    file.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
}

/// All that is shown, one array after the other.
void writeShown(const Character& character, const fs::path& folder, const std::string& pose) {
    for (const Shape shape : {Shape::skin, Shape::neural, Shape::target}) {
        const std::string name = pose + '.' + std::to_string(static_cast<int>(shape)) + '.';
        writeBytes(folder / (name + "points"), std::as_bytes(character.points(shape)));
        writeBytes(folder / (name + "errors"), std::as_bytes(character.errors(shape)));
        writeBytes(folder / (name + "draw_points"), std::as_bytes(character.drawPoints(shape)));
        writeBytes(folder / (name + "draw_normals"), std::as_bytes(character.drawNormals(shape)));
        writeBytes(folder / (name + "draw_errors"), std::as_bytes(character.drawErrors(shape)));
    }
}

void writeSample(const SampleOptions& options, const fs::path& folder) {
    SampleCharacter sample(options);
    sample.addChecks({1, 3});
    sample.write(folder / "blocks");
    const viewer::Blocks blocks = sample.blocks();
    std::ofstream sums(folder / "sums");
    for (const auto& [name, bytes] : sample.bytes())
        sums << name << ' ' << std::hex << blocks.sum(name) << '\n';
    Character character(blocks);
    for (std::uint32_t frame = 0; frame < options.frames; ++frame) {
        character.showFrame(frame);
        writeShown(character, folder, "frame" + std::to_string(frame));
    }
    if (!character.hasRig())
        return;
    const auto sliders = sample.get<double>("frames.sliders");
    character.showSliders(2, std::span(sliders).first(character.sliderCount()));
    writeBytes(folder / "sliders.controls", std::as_bytes(character.controls()));
    writeShown(character, folder, "sliders");
}

} // namespace

int main(int, char** arguments) try {
    const SampleOptions rows[] = {
        {.seed = 21, .hasWeights = true, .hasSeams = true, .hidden = 24},
        {.seed = 22, .basisBytes = 2, .isPartial = true, .hasEnvelope = true, .hasTargetPoints = false},
        {.seed = 23, .subdivisions = 3, .basisBytes = 1, .deltaMode = 0},
        {.seed = 24, .subdivisions = 3, .shapes = 0, .passes = 11, .hidden = 7},
        {.seed = 25, .shapes = 30, .passes = 0, .takesPoints = true},
    };
    for (const SampleOptions& options : rows)
        writeSample(options, fs::path(arguments[1]) / std::to_string(options.seed));
} catch (const std::exception& error) {
    std::cerr << error.what() << '\n';
    return 1;
}
