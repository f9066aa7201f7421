// SPDX-License-Identifier: Apache-2.0
// Reasons of failures. That each call of a frame may fail is swept with whole scenes, in the tests of the plug-in.
#include "OnDevice.h"

#include <gtest/gtest.h>

using namespace OpenQuarn;

namespace {

using GpuFailures = OnDevice;

TEST_F(GpuFailures, TheFirstReasonIsKeptUntilItIsTaken) {
    EXPECT_EQ(HOpenCLInfo::checkCLErrorStatus(CL_SUCCESS), CL_SUCCESS);
    EXPECT_EQ(takeFailure(), "");
    EXPECT_EQ(HOpenCLInfo::checkCLErrorStatus(CL_INVALID_VALUE, "some/where/deform.cpp", 12), CL_INVALID_VALUE);
    EXPECT_EQ(noteFailure(CL_OUT_OF_RESOURCES, "later"), CL_OUT_OF_RESOURCES);
    noteFailure("later still");
    EXPECT_EQ(takeFailure(), "an OpenCL call: CL_INVALID_VALUE (-30), deform.cpp:12");
    noteFailure(-12345, "clFinish");
    EXPECT_EQ(takeFailure(), "clFinish: unknown status (-12345)");
    EXPECT_EQ(takeFailure(), "");
}

} // namespace
