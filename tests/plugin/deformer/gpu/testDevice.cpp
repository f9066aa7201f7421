// SPDX-License-Identifier: Apache-2.0
#include "plugin/deformer/gpu/testDevice.h"

#include "openquarn_app/Gpu.h"

#include <gtest/gtest.h>

#include <cstdlib>

void chooseTestDevice() {
    const char* choice = std::getenv("NW_TEST_DEVICE"); // NOLINT(concurrency-mt-unsafe): nobody sets it
    OpenQuarn::Gpu::chooseDevice(choice ? choice : "");
}

namespace {

class ChosenDevice : public testing::Environment {
    void SetUp() override { chooseTestDevice(); }
};

[[maybe_unused]] const auto* const registered = testing::AddGlobalTestEnvironment(new ChosenDevice);

} // namespace
