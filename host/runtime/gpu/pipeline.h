// SPDX-License-Identifier: Apache-2.0
// Whether a geometry is evaluated on the device or on the CPU (docs/gpu.md).
#pragma once

#include "geometry/MeshData.h"
#include "graph/Node.h"
#include "openquarn/HDataBlock.h"

#include <memory>
#include <string>

namespace OpenQuarn {

/// Has everything on this thread evaluated on the CPU, for as long as it lives.
class CpuOnly {
public:
    explicit CpuOnly(bool on);
    ~CpuOnly();
    CpuOnly(const CpuOnly&) = delete;
    CpuOnly& operator=(const CpuOnly&) = delete;

private:
    bool on_;
};

/// The geometry, deformed on the device with the deformers before it that can be. Null when it has to be evaluated on
/// the CPU; `failed` is then true when the device should have done it: the user has been told, and the deformers before
/// it have to run on the CPU too. Thread: one that evaluates, which holds the lock of the graph.
std::shared_ptr<MeshData> evaluateOnDevice(NodeData& data, unsigned index, bool& failed);

/// To be told of each evaluation on the CPU, once it is over.
void evaluatedOnCpu(NodeData& data, HDataBlock& block, unsigned index, const HStatus& status, bool isFallback);

/// Takes all geometries of a node type, or of every type for "", from the device. Thread: main.
void takeFromDevice(const std::string& nodeType);

} // namespace OpenQuarn
