// SPDX-License-Identifier: Apache-2.0
// What the pipeline keeps of one geometry whose node type has a GPU deformer.
#pragma once

#include "geometry/GeometryDevice.h"
#include "gpu/Device.h"
#include "openquarn/HObjectArray.h"
#include "openquarn/gpu/HGPUDeformerData.h"
#include "openquarn/gpu/HGPUDeformerRegistrationInfo.h"
#include "openquarn/gpu/HPxGPUDeformer.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

namespace OpenQuarn {

class Node;

/// Positions of a mesh on the device.
struct DevicePositions {
    /// Stages them (transfer.h) unless they are there already. A failing status leaves nothing.
    cl_int bring(const Positions& positions);

    HOpenCLBuffer buffer;
    std::uint64_t version = 0; ///< of what is in the buffer; 0: nothing
};

/// What its registration info says of a node.
struct DeformerTraits {
    HObject output, input, passThrough; ///< attributes
    HObjectArray additional;
    bool matchesIndices = true;
    bool isGeometryFilter = true;
};

/// The destructor runs where no evaluation is going on.
class GpuGeometry final : public DeviceGeometry {
public:
    /// `node` whose geometry it is; outlives this.
    GpuGeometry(HGPUDeformerRegistrationInfo& registration, const Node& node)
        : info(registration)
        , node_(node) {}
    ~GpuGeometry() override { leaveDevice(); }

    /// Makes the deformer, unless it is there and its buffers are on that device. False when the plug-in makes none.
    bool enterDevice(const std::shared_ptr<Device>& onto);
    /// Has the deformer terminate(), and lets go of it and of everything on the device.
    void leaveDevice() noexcept;

    HGPUDeformerRegistrationInfo& info;
    DeformerTraits traits;

    /// Numbers of the priming attributes in the last evaluation on the CPU; none for a plug that is not there.
    std::vector<std::optional<double>> primedValues;
    /// The user has been told that the device is not used, and why.
    bool isFailing = false;

    std::unique_ptr<HPxGPUDeformer> deformer; ///< null: not on the device
    DevicePositions input;                    ///< of the mesh that comes in from the host's memory
    DevicePositions passedThrough;            ///< of another mesh that a pass-through gives
    std::vector<DevicePositions> additional;  ///< parallel to traits.additional
    HGPUDeformerData inputData, outputData;

private:
    const Node& node_;
    std::shared_ptr<Device> device_;
};

} // namespace OpenQuarn
