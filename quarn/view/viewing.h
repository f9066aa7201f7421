// SPDX-License-Identifier: Apache-2.0
// Making a page of a deformed mesh.
#pragma once

#include "quarn/scene/frames.h"
#include "quarn/scene/useModel.h"
#include "quarn/view/PageFacts.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quarn {

struct Console;
class SceneSession;

/// What a page is made of.
struct ViewPlan {
    const Warp& warp;
    const WarpGeometry& geometry;
    FrameRange frames;
    BasisKind basis = BasisKind::i16;
    std::optional<TargetKind> target; ///< none: points, where there is a target
    std::uint32_t textureSize = 1024; ///< longest side; 0: no textures
    std::string title, scene;
    PageView view;
    std::optional<double> limitMm; ///< above 0
    std::filesystem::path output;
};

struct ViewResult {
    std::uint64_t bytes = 0;                                  ///< of the file
    std::vector<std::pair<std::string, std::uint64_t>> parts; ///< of it, by name
    PageFacts facts;
    std::size_t vertices = 0, frames = 0, sliders = 0;
    BasisKind basis = BasisKind::i16; ///< as it was asked for
    std::size_t shapes = 0;
    std::vector<int> frameNumbers;
    std::optional<std::pair<PageErrors, PageErrors>> errors; ///< before and after
};

/// Plays the frames, proves the page, and writes it. Throws std::runtime_error with the sentence for the user, and
/// Interrupted; nothing is written then. Thread: main.
ViewResult makePage(SceneSession& session, const ViewPlan& plan, const Console& console);

} // namespace quarn
