// SPDX-License-Identifier: Apache-2.0
// The sliders of a rig, by name. All throw std::runtime_error with a sentence that names the node or plug. Thread:
// main.
#pragma once

#include "openquarn/HPlug.h"

#include <string>
#include <vector>

namespace quarn {

/// The node type.
constexpr const char* slidersType = "sliders";

/// The slider that a plug is about: `slider[i]` for `slider[i].value` and `output[i]` of a node of this type; null for
/// every other plug.
HPlug sliderBehind(const HPlug& plug);

/// "face.browUp" for the slider with the name browUp of the node face; "face.slider[3]" without a name.
std::string sliderName(const HPlug& slider);

/// `slider[i].value`.
HPlug valueOf(const HPlug& slider);

/// The sliders of a node of this type, in order of index.
std::vector<HPlug> slidersOf(const HObject& node);

/// The plug that people mean by a name: `slider[i].value` for "face.browUp", where the node face has such a slider;
/// else findPlug(). Throws where several sliders of the node have the name, too.
HPlug findControl(const std::string& name);

} // namespace quarn
