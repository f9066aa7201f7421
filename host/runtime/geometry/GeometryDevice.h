// SPDX-License-Identifier: Apache-2.0
// What may deform geometries in the place of their filters: the pipeline on the GPU, where it is on.
#pragma once

#include "geometry/MeshData.h"
#include "openquarn/HDataBlock.h"
#include "openquarn/HStatus.h"

#include <atomic>
#include <memory>

namespace OpenQuarn {

class NodeData;

/// What a device keeps of one geometry of a filter. Its end takes the geometry from the device. Thread: as
/// GeometryState.
class DeviceGeometry {
public:
    virtual ~DeviceGeometry() = default;
    DeviceGeometry(const DeviceGeometry&) = delete;
    DeviceGeometry& operator=(const DeviceGeometry&) = delete;

    /// The last evaluation on the CPU succeeded, and nothing has changed since but what comes along connections.
    bool isPrimed = false;

protected:
    DeviceGeometry() = default;
};

/// Thread: one that evaluates, which holds the lock of the graph.
class GeometryDevice {
public:
    /// The geometry, deformed on the device with the deformers before it that can be. Null when it has to be evaluated
    /// on the CPU; `failed` is then true when the device should have done it: the user has been told, and the deformers
    /// before it have to run on the CPU too.
    virtual std::shared_ptr<MeshData> evaluate(NodeData& data, unsigned index, bool& failed) = 0;
    /// Is told of each evaluation on the CPU, once it is over.
    virtual void evaluatedOnCpu(NodeData& data, HDataBlock& block, unsigned index, const HStatus& status,
                                bool isFallback) = 0;

    /// The one that is on; null for none. Thread: any.
    static GeometryDevice* current() noexcept { return inUse.load(std::memory_order_relaxed); }
    /// `device` null, or one that lasts as long as the process. Thread: main, outside of evaluations.
    static void setCurrent(GeometryDevice* device) noexcept { inUse = device; }

protected:
    ~GeometryDevice() = default;

private:
    static inline std::atomic<GeometryDevice*> inUse{nullptr};
};

} // namespace OpenQuarn
