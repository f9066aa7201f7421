// SPDX-License-Identifier: Apache-2.0
#include "OnDevice.h"

#include "gpu/transfer.h"

#include <gmock/gmock.h>

#include <array>
#include <limits>
#include <set>

using namespace OpenQuarn;
using testing::HasSubstr;

namespace {

// All that a frame does on the device, with what stays between frames.
class Frame {
public:
    explicit Frame(HString file, std::size_t vertices = 1)
        : file_(std::move(file))
        , vertices_(vertices) {}

    // False when something failed: then there is a reason.
    bool run() {
        const auto in = newPositions(vertices_);
        const auto out = newPositions(vertices_);
        std::fill_n(in->xyz(), 3 * vertices_, 1.0);
        if (uploadPositions(*in, positions_) != CL_SUCCESS || !kernel_.loadOrUpdate(file_, "count", 3))
            return false;
        HOpenCLEvent done;
        if (HOpenCLUtils::uploadToGPU(sizeof seven_, &seven_, add_, HOpenCLUtils::kCopyData) != CL_SUCCESS ||
            enqueue(done) != CL_SUCCESS)
            return false;
        positions_.setBufferReadyEvent(done);
        return downloadPositions(positions_, *out) == CL_SUCCESS;
    }
    bool isRight() { // the kernel writes ints where the positions are
        clFinish(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue());
        std::array<int, 3> seen = {};
        clEnqueueReadBuffer(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue(), positions_.get(), CL_TRUE, 0, sizeof seen,
                            seen.data(), 0, nullptr, nullptr);
        return seen == std::array{8, 9, 10};
    }
    void reset() {
        positions_.reset();
        add_.reset();
        kernel_.reset();
    }

private:
    cl_int enqueue(HOpenCLEvent& done) {
        cl_int status = CL_SUCCESS;
        const cl_uint count = 3;
        kernel_.setKernelArgBuffer(0, positions_, status);
        kernel_.setKernelArgBuffer(1, add_, status);
        HOpenCLUtils::setKernelArg(kernel_, 2, sizeof count, &count, status);
        if (status != CL_SUCCESS)
            return status;
        return kernel_.enqueueKernel({positions_.bufferReadyEvent(), add_.bufferReadyEvent()}, &done);
    }

    const HString file_;
    const std::size_t vertices_;
    const int seven_ = 7;
    HOpenCLBuffer positions_;
    HOpenCLBuffer add_;
    HOpenCLKernelInfo kernel_;
};

class GpuFailures : public OnDevice {
protected:
    // Makes the calls of a frame fail from the first on, each in a run of its own, and then again with all that follow.
    void sweep(std::uint64_t times, bool isWarm, std::size_t vertices = 1) {
        const HString file = write("count.cl", countKernel);
        std::set<std::string> failed;
        for (std::uint64_t number = 1;; ++number) {
            Frame frame(file, vertices);
            if (isWarm)
                ASSERT_TRUE(frame.run());
            else
                closeDevice();
            takeFailure();
            clshim::failCall(number, CL_OUT_OF_RESOURCES, times);
            const bool succeeded = frame.run();
            const std::string call = clshim::failedCall();
            if (call.empty()) {
                clshim::heal();
                EXPECT_TRUE(succeeded);
                EXPECT_GT(number, isWarm ? 10U : 25U) << "too few calls were tried";
                break;
            }
            SCOPED_TRACE(std::to_string(number) + ": " + call);
            check(succeeded, call, times == 1);
            frame.reset();
            closeDevice();
            clshim::heal();
            takeFailure();
            EXPECT_EQ(clshim::liveObjects(), liveBefore());
            EXPECT_TRUE(frame.run() && frame.isRight()) << takeFailure();
        }
    }

private:
    // `call` the last one that failed, and the first if that is named. A frame can do without releases and names.
    static void check(bool succeeded, const std::string& call, bool isNamed) {
        const std::string reason = takeFailure();
        const bool isVital =
            call.find("Release") == std::string::npos && call != "clGetDeviceInfo" && call != "clRetainEvent";
        EXPECT_FALSE(isVital && succeeded);
        if (succeeded && !isVital)
            return;
        EXPECT_THAT(reason, HasSubstr("CL_OUT_OF_RESOURCES (-5)"));
        EXPECT_THAT(reason, HasSubstr(isNamed ? call : ""));
    }
};

TEST_F(GpuFailures, EachCallOfTheFirstFrame) {
    sweep(1, false);
}
TEST_F(GpuFailures, EachCallOfALaterFrame) {
    sweep(1, true);
}
TEST_F(GpuFailures, EachCallOfALaterFrameWhosePositionsAreMapped) {
    sweep(1, true, 30000);
}
TEST_F(GpuFailures, TheDeviceIsLostInTheFirstFrame) {
    sweep(std::numeric_limits<std::uint64_t>::max(), false);
}
TEST_F(GpuFailures, TheDeviceIsLostInALaterFrame) {
    sweep(std::numeric_limits<std::uint64_t>::max(), true);
}

TEST_F(GpuFailures, ALaterFrameMakesNothing) {
    Frame frame(write("count.cl", countKernel));
    ASSERT_TRUE(frame.run() && frame.run());
    const std::int64_t live = clshim::liveObjects();
    const auto made = [] {
        return clshim::calls("clCreateBuffer") + clshim::calls("clBuildProgram") + clshim::calls("clCreateKernel");
    };
    const std::uint64_t before = made();
    const std::uint64_t waits = clshim::calls("clFinish") + clshim::calls("clWaitForEvents");
    ASSERT_TRUE(frame.run());
    EXPECT_EQ(made(), before);
    EXPECT_EQ(clshim::liveObjects(), live);
    EXPECT_LE(clshim::calls("clFinish") + clshim::calls("clWaitForEvents"), waits + 2); // for the copies of the uploads
}

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
