// SPDX-License-Identifier: Apache-2.0
// Which geometries are on the device (docs/gpu.md): the pipeline itself is a GeometryDevice, on by Gpu::setEnabled().
#pragma once

#include <string>

namespace OpenQuarn {

/// Takes all geometries of a node type, or of every type for "", from the device. Thread: main.
void takeFromDevice(const std::string& nodeType);

} // namespace OpenQuarn
