// SPDX-License-Identifier: Apache-2.0
// Whether a page shows what quarn play shows: its very bytes are opened by the core's native build, and frame by frame
// compared with what the scene gave.
#pragma once

#include "quarn/view/PageContent.h"
#include "viewer/Character.h"

#include <cstddef>
#include <functional>

namespace quarn {

/// The largest distance of a vertex, in millimetres.
struct Farthest {
    double distance = 0.0;
    std::size_t frame = 0, vertex = 0; ///< from 0
};

/// How a frame is shown: from the time line, or by the values of sliders that it has.
enum class ShownBy { frame, sliders };

/// How far the page is from the scene, over all frames.
struct PageProof {
    Farthest skin;   ///< from what comes into the deformer
    Farthest neural; ///< from what it gives out
};

/// `step` is called after each frame. Throws std::runtime_error where a frame cannot be shown, and Interrupted.
PageProof compareWithScene(
    viewer::Character& character, ShownBy by, const PageContent& content, const std::function<void()>& step = [] {});

/// First, last, `worst` and two in between, fewer where there are fewer, with the sums of their points.
PageChecks checksOf(viewer::Character& character, std::size_t worst);

} // namespace quarn
