// SPDX-License-Identifier: Apache-2.0
// A strip with three joints, set up as `quarn import --neural-warp` sets a character up; and quarn's command line.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

namespace stripScene {

constexpr std::size_t vertexCount = 18;

/// The plugs that are sampled: "middle.rotateX", "middle.rotateY", "middle.rotateZ", "tip.rotateZ", in order.
const std::vector<std::string>& sampledPlugs();
/// Their limits and defaults: least, most, default.
struct Limits {
    double least, most, rest;
};
const std::vector<Limits>& limits();

/// Writes the scene: mesh "strip", joints "root", "middle", "tip", skin cluster "strip_skin", deformer "warp",
/// collectors "poses" and "controls". `further` host commands that run before it is saved.
void write(const std::filesystem::path& scene, const std::string& further = {});

/// Runs `quarn ARGUMENTS` in this process. Gives what it printed; throws what it failed with.
std::string quarn(const std::vector<std::string>& arguments);
/// The sentence of the failure; fails the test when there is none.
std::string failureOf(const std::vector<std::string>& arguments);

} // namespace stripScene
