// SPDX-License-Identifier: Apache-2.0
// A strip with three joints, set up as `quarn import --neural-warp` sets a character up; and quarn's command line.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

namespace stripScene {

constexpr std::size_t vertexCount = 18;
/// Each edge between two quads is a seam of the UVs: vertices more in a file that has them by vertex.
constexpr std::size_t seamCopies = 14;

/// A plug that is sampled, where "poses" has its limits, and these.
struct Sampled {
    const char *plug, *place;
    double least, most, rest;
};
/// In order.
inline constexpr Sampled sampled[] = {{"middle.rotateX", "limitsList[0].limits[0]", -0.5, 0.5, 0.0},
                                      {"middle.rotateY", "limitsList[0].limits[1]", -0.25, 0.75, 0.0},
                                      {"middle.rotateZ", "limitsList[0].limits[2]", 0.0, 2.0, 0.0},
                                      {"tip.rotateZ", "limitsList[1].limits[0]", 0.25, 1.5, 0.5}};

/// Writes the scene: mesh "strip", joints "root", "middle", "tip", skin cluster "strip_skin", deformer "warp",
/// collectors "poses" and "controls". `further` host commands that run before it is saved.
void write(const std::filesystem::path& scene, const std::string& further = {});

/// Runs `quarn pose|target|play|bake ARGUMENTS` in this process. Gives what it printed; throws what it failed with.
std::string quarn(const std::vector<std::string>& arguments);

} // namespace stripScene
