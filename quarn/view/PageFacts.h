// SPDX-License-Identifier: Apache-2.0
// What a page says of itself beside its blocks.
#pragma once

#include "quarn/view/PageContent.h"
#include "quarn/view/proof.h"

#include <string>

namespace quarn {

/// Where the viewer stands at first, in degrees, as quarn render has it.
struct PageView {
    double azimuth = 25.0, elevation = 10.0;
    std::string up = "y"; ///< "x", "y" or "z"
};

struct PageFacts {
    std::string title, mesh, scene; ///< names; the scene's of its file without folders
    double diagonalMm = 0.0;        ///< of the rest mesh
    double framesPerSecond = 24.0;
    std::string whyNoSliders; ///< a sentence; empty where there are some
    std::string whyPoints;    ///< why the points of frames come in; empty where the page computes them
    double basisErrorMm = 0.0;
    Farthest difference;    ///< to what quarn play shows
    double limitMm = 0.01;  ///< of it, beside basisErrorMm
    double slidersMm = 0.0; ///< the same, when frames are shown by the values of their sliders
    PageView view;
};

/// The JSON of the page, in UTF-8 and without "<", so that it can stand in HTML whatever the names in it are.
std::string manifestOf(const PageContent& content, const PageFacts& facts, const PageBlocks& blocks);

} // namespace quarn
