// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn_app/Gpu.h"

// The pipeline of the device is on as long as this lives.
class PipelineOn {
public:
    PipelineOn() { OpenQuarn::Gpu::setEnabled(true); }
    ~PipelineOn() { OpenQuarn::Gpu::setEnabled(false); }
    PipelineOn(const PipelineOn&) = delete;
    PipelineOn& operator=(const PipelineOn&) = delete;
};
