// SPDX-License-Identifier: Apache-2.0
// Counts what happens on the device (openquarn_app/Gpu.h). Thread: any.
#pragma once

#include "openquarn/gpu/opencl.h"
#include "openquarn_app/Gpu.h"

#include <chrono>
#include <cstddef>
#include <memory>
#include <string_view>

namespace OpenQuarn {

struct Device;

void countLaunch(std::string_view kernel);
void countUpload(std::string_view name, std::size_t bytes);
void countDownload(std::size_t bytes);
void countEvaluation(bool onGpu, bool isFallback = false);

/// Keeps the event of a command, whose time counts under `name` once it has run; does nothing unless the device is
/// timed. The times are added up by the next timesMeasured().
void timeCommand(const Device& device, std::string_view name, cl_event event);
void timesMeasured();

/// Counts what the host does while this lives as a step (GpuCounts::hostSeconds), on a device that is timed. The name
/// outlives it.
class TimedStep {
public:
    TimedStep(const Device& device, std::string_view name);
    ~TimedStep();
    TimedStep(const TimedStep&) = delete;
    TimedStep& operator=(const TimedStep&) = delete;

private:
    std::string_view name_; ///< empty: not timed
    std::chrono::steady_clock::time_point start_;
};

} // namespace OpenQuarn
