// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HOpenCLBuffer.h"
#include "openquarn_app/Gpu.h"
#include "openquarn_app/Session.h"
#include "support/openclShim.h"

#include <gtest/gtest.h>

using namespace OpenQuarn;

TEST(OpenclShim, StandsBetweenTheHostsLibraryAndTheLoader) {
    const std::uint64_t before = clshim::calls("clGetPlatformIDs");
    const bool hasDevice = !Gpu::devices().empty();
    EXPECT_GT(clshim::calls("clGetPlatformIDs"), before);
    if (!hasDevice)
        GTEST_SKIP() << "there is no OpenCL device";
    {
        const Session session;
        HOpenCLBuffer buffer;
        ASSERT_EQ(buffer.ensureBufferSize(4), CL_SUCCESS);
        EXPECT_EQ(clshim::liveObjects(), 3);      // context, queue, buffer
        clshim::failCall(2, CL_OUT_OF_RESOURCES); // after the old buffer's release
        EXPECT_EQ(buffer.ensureBufferSize(8), CL_OUT_OF_RESOURCES);
        EXPECT_EQ(clshim::failedCall(), "clCreateBuffer");
        EXPECT_EQ(clshim::liveObjects(), 2);
    }
    clshim::heal();
    EXPECT_EQ(clshim::liveObjects(), 0) << "the end of a session closes the device";
}
