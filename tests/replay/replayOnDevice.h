// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "compare.h"

namespace replay {

// What became of the deform steps of scenarios on an OpenCL device.
struct DeviceTally {
    std::string device;            // its name
    std::size_t compared = 0;      // positions that came from the device
    std::size_t passedThrough = 0; // of these, without a kernel
    std::size_t onCpu = 0;         // positions that came from the CPU, as they should
    std::size_t leftOut = 0;       // the step fails, its target morph takes nearly all of the model away, or the next
                                   // frame is to load what this one gave up
};

// Chooses the device to replay on, "" for the first; false when there is none at all. Throws std::invalid_argument,
// which lists what there is, when none fits.
bool chooseDevice(const std::string& choice);

// Does the steps of a scenario with the GPU pipeline on. Each deform step, once it was evaluated on the CPU as ever, is
// evaluated a second time on the device. Lists the positions that are further than onDeviceTolerance from the expected
// ones, the steps that the device did not take though it should have, and an exception.
std::vector<Disagreement> replayOnDevice(const Case& testCase, DeviceTally& tally);

} // namespace replay
