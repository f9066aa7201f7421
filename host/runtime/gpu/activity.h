// SPDX-License-Identifier: Apache-2.0
// Counts what happens on the device (openquarn_app/Gpu.h). Thread: any.
#pragma once

#include "openquarn/gpu/opencl.h"
#include "openquarn_app/Gpu.h"

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

} // namespace OpenQuarn
