// SPDX-License-Identifier: Apache-2.0
// Names for the control values of a deformer.
#pragma once

#include <string>
#include <vector>

namespace quarn {

struct Warp;

/// One name for each element of controlValues that exists, in their order, no two the same. The name is the plug that
/// the value comes from, looked for beyond the control nodes: "arm.rotateX" for a value that a controlCollector passes
/// on, "arm.relativeMatrix:2" for the third number that a converter makes of a matrix, "face.browUp" for a slider of
/// that name. Where nothing is connected, it is the plug that holds the value: "faceControls.inputList[0].input[1]".
/// The plug has to have been evaluated. Throws std::runtime_error, naming the plug. Thread: main.
std::vector<std::string> controlNames(const Warp& warp);

} // namespace quarn
