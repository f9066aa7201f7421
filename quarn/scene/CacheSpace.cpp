// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/CacheSpace.h"

#include "quarn/console/numberText.h"
#include "storage/finite.h"

#include <CLI/CLI.hpp>

#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

std::string problemOfScale(const std::string& text) {
    double scale = 0.0;
    if (CLI::detail::lexical_cast(text, scale) && std::isfinite(scale) && scale > 0.0)
        return {};
    return "units of the scene a unit of the cache are a finite number above 0, and not '" + text + "'";
}

} // namespace

void CacheSpace::toScene(std::span<double> xyz) const {
    if (isTheScenes())
        return;
    const bool isZUp = axes == "z";
    for (std::size_t i = 0; i + 2 < xyz.size(); i += 3) {
        if (isZUp) {
            const double y = xyz[i + 1];
            xyz[i + 1] = xyz[i + 2];
            xyz[i + 2] = -y;
        }
        for (std::size_t axis = 0; axis < 3; ++axis)
            xyz[i + axis] *= scale;
    }
}

void CacheSpace::toCache(std::span<float> xyz) const {
    if (isTheScenes())
        return;
    const bool isZUp = axes == "z";
    for (std::size_t i = 0; i + 2 < xyz.size(); i += 3) {
        if (isZUp) {
            const float y = xyz[i + 1];
            xyz[i + 1] = -xyz[i + 2];
            xyz[i + 2] = y;
        }
        for (std::size_t axis = 0; axis < 3; ++axis)
            xyz[i + axis] = static_cast<float>(static_cast<double>(xyz[i + axis]) / scale);
    }
    if (const auto place = storage::firstNotFinite(xyz))
        throw std::runtime_error("vertex " + std::to_string(*place / 3) +
                                 " is too far away for single precision at --scale " + numberText(scale));
}

void addCacheSpaceOptions(CLI::App& command, CacheSpace& space) {
    command.add_option("--axes", space.axes, "The cache's axis that is up, where the scene's is y")
        ->check(CLI::IsMember({"y", "z"}))
        ->capture_default_str();
    command
        .add_option("--scale", space.scale, "Units of the scene a unit of the cache: 0.01 for centimetres in metres")
        ->check(CLI::Validator(problemOfScale, "ABOVE 0"))
        ->capture_default_str();
}

} // namespace quarn
