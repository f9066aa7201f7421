// SPDX-License-Identifier: Apache-2.0
// The GPU pipeline: whether deformers run on an OpenCL device, on which, and what that did.
#pragma once

#include "openquarn/HApi.h"

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace OpenQuarn {

/// A device that the OpenCL loader knows.
struct GpuDevice {
    std::string name;
    std::string platform;
    std::string driver;
    bool isGpu = false;
    bool hasDoubles = false;
    std::uint64_t memory = 0; ///< bytes
};

/// What happened on the device since the counts were reset. Of a chain of deformers each geometry of each counts.
struct GpuCounts {
    std::uint64_t gpuEvaluations = 0; ///< geometries that were deformed on the device
    std::uint64_t cpuEvaluations = 0; ///< deformed on the CPU while the pipeline was on and could have taken them
    std::uint64_t fallbacks = 0;      ///< of these, after a failure on the device
    std::map<std::string, std::uint64_t> launches; ///< by name of the kernel
    /// Of buffers that are not empty, by name: a published buffer's, "positions", "weights", "affectMap", or "values"
    /// for what a deformer uploads itself.
    std::map<std::string, std::uint64_t> uploads;
    std::uint64_t downloads = 0;
    std::uint64_t bytesUp = 0, bytesDown = 0;
    /// Seconds on the device, by kernel, "copy", "upload" and "download"; only with Gpu::setTiming().
    std::map<std::string, double> seconds;
    /// Seconds of the host at "upload" (positions of meshes), "deform" (what the deformer does before its kernels run),
    /// "wait" (for them) and "download"; only with Gpu::setTiming().
    std::map<std::string, double> hostSeconds;
};

/// Off at the start of a process. Thread: main, unless a function says otherwise.
class OPENQUARN_API Gpu {
public:
    Gpu() = delete;

    /// With the pipeline on, a geometry whose node type has a GPU deformer runs on the device from its second
    /// evaluation on, as long as nothing but what comes in through connections changes (docs/gpu.md). Switching it off
    /// takes all geometries from the device.
    static void setEnabled(bool enabled);
    static bool isEnabled() noexcept;

    /// All devices, in the order of the loader: GPUs first, then the others. Empty when there is none.
    static std::vector<GpuDevice> devices();
    /// Which one is used from now on: "" for the first, its number in devices(), or a part of its name or its
    /// platform's in any case, the first that has it. Throws std::invalid_argument, which lists what there is, when
    /// there is no such device; what was chosen then stays. "" is never refused. Closes the device in use.
    static void chooseDevice(const std::string& choice);
    /// The device in use; none before it was used.
    static std::optional<GpuDevice> currentDevice();

    /// For tests: kernels are compiled as for a device without double precision.
    static void assumeNoDoubles(bool assume);
    /// Measures what runs on the device (GpuCounts::seconds), which costs time itself. A change closes the device.
    static void setTiming(bool on);

    static GpuCounts counts();
    static void resetCounts();
};

} // namespace OpenQuarn
