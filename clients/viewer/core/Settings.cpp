// SPDX-License-Identifier: Apache-2.0
#include "Settings.h"

#include "checks.h"
#include "frame/DeltaSettings.h"

#include <limits>
#include <string>

namespace viewer {
namespace {

constexpr const char* block = "settings";
constexpr std::size_t settingCount = 16;

void checkAtMost(const char* what, std::uint32_t value, std::uint32_t most) {
    if (value > most)
        refuse(block, std::string(what) + " is " + std::to_string(value) + ", above " + std::to_string(most));
}

} // namespace

Settings readSettings(const Blocks& blocks) {
    constexpr std::uint32_t mostIterations = 10'000; // more than any frame of a page could wait for
    const auto values = arrayOf<std::uint32_t>(blocks, block, settingCount);
    if (values[0] != 1)
        refuse(block, "the page is of version " + std::to_string(values[0]) + ", and this core of version 1");
    checkAtMost("the number of vertices", values[1], std::numeric_limits<std::int32_t>::max());
    checkAtMost("the delta mode", values[2], neuralWarp::kSurfaceMode);
    checkAtMost("the number of smoothing iterations", values[3], mostIterations);
    checkAtMost("the input", values[8], 1);
    Settings settings{.vertices = values[1],
                      .deltaMode = values[2],
                      .smoothingIterations = values[3],
                      .shapes = values[4],
                      .slots = values[5],
                      .controls = values[6],
                      .frames = values[7],
                      .takesPoints = values[8] == 1,
                      .matrices = values[9],
                      .joints = values[10],
                      .sliders = values[11],
                      .blendShapes = values[12],
                      .freeValues = values[13],
                      .converters = values[14]};
    if (settings.frames == 0)
        refuse(block, "there are no frames");
    if (settings.vertices == 0)
        refuse(block, "the mesh has no vertices");
    if (settings.takesPoints && settings.hasRig())
        refuse(block, "points come in from frames, and " + std::to_string(settings.sliders) + " sliders move nothing");
    return settings;
}

} // namespace viewer
