// SPDX-License-Identifier: Apache-2.0
#include "gpu/failure.h"
#include "openquarn/gpu/HOpenCLInfo.h"
#include "openquarn/gpu/HOpenCLKernelInfo.h"
#include "openquarn/gpu/HOpenCLUtils.h"
#include "openquarn_app/Gpu.h"

#include <gtest/gtest.h>

#include <stdexcept>

using namespace OpenQuarn;

TEST(WithoutDevice, EverythingAnswersWithTheReason) {
    const char* const reason = "no OpenCL device was found";
    EXPECT_TRUE(Gpu::devices().empty());
    EXPECT_FALSE(Gpu::currentDevice());
    EXPECT_EQ(takeFailure(), "");

    EXPECT_EQ(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue(), nullptr);
    EXPECT_EQ(takeFailure(), reason);
    HOpenCLBuffer buffer;
    const int value = 1;
    EXPECT_EQ(HOpenCLUtils::uploadToGPU(sizeof value, &value, buffer), CL_DEVICE_NOT_FOUND);
    EXPECT_TRUE(buffer.isNull());
    EXPECT_EQ(takeFailure(), reason);
    HOpenCLKernelInfo kernel;
    EXPECT_FALSE(kernel.loadOrUpdate("a.cl", "a", 1));
    EXPECT_EQ(takeFailure(), reason);

    EXPECT_NO_THROW(Gpu::chooseDevice(""));
    try {
        Gpu::chooseDevice("0");
        ADD_FAILURE() << "a device that is not there was chosen";
    } catch (const std::invalid_argument& error) {
        EXPECT_STREQ(error.what(), "there is no OpenCL device \"0\": no OpenCL device was found");
    }
}
