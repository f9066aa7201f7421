// SPDX-License-Identifier: Apache-2.0
// From where a picture is taken.
#pragma once

#include "openquarn/HVector.h"

#include <string>

namespace quarn {

/// Unit vectors of a view in object space, right-handed: to the right and to the top of the picture, and to the viewer.
struct View {
    HVector right{1.0, 0.0, 0.0};
    HVector up{0.0, 1.0, 0.0};
    HVector viewer{0.0, 0.0, 1.0};
};

/// `direction` "front", "back", "left", "right", "top", "bottom" (the side of the picture's object that is seen, left
/// and right as the viewer of the front has them), or "AZIMUTH,ELEVATION" in degrees: how far the viewer has gone to
/// the right around the object, any, and how high above its middle, -90 to 90. `up` "x", "y" or "z": the axis that
/// points up; the front is seen from +z, with z up from -y. Throws std::runtime_error, quoting the text, for anything
/// else.
View viewFrom(const std::string& direction, const std::string& up);

} // namespace quarn
