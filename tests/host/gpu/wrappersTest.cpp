// SPDX-License-Identifier: Apache-2.0
#include "OnDevice.h"

#include "gpu/activity.h"
#include "gpu/transfer.h"

#include <gmock/gmock.h>

#include <numeric>

using namespace OpenQuarn;
using testing::ElementsAre;
using testing::Pair;

namespace {

using GpuBuffers = OnDevice;
using GpuUploads = OnDevice;
using GpuPositions = OnDevice;
using GpuCounting = OnDevice;

TEST_F(GpuBuffers, OnlyGrowAndAreSharedByCopies) {
    HOpenCLBuffer buffer;
    EXPECT_TRUE(buffer.isNull());
    EXPECT_EQ(buffer.ensureBufferSize(0), CL_SUCCESS);
    EXPECT_TRUE(buffer.isNull());

    const struct {
        std::size_t asked, capacity;
        bool isKept;
    } steps[] = {{12, 12, false}, {4, 12, true}, {12, 12, true}, {0, 12, true}, {100, 100, false}, {99, 100, true}};
    for (const auto& step : steps) {
        SCOPED_TRACE(step.asked);
        const auto* before = buffer.get();
        const HOpenCLBuffer copy = buffer;
        ASSERT_EQ(buffer.ensureBufferSize(step.asked), CL_SUCCESS);
        EXPECT_EQ(buffer.bufferSize(), step.asked);
        EXPECT_EQ(buffer.capacity(), step.capacity);
        EXPECT_EQ(buffer.get() == before, step.isKept);
        EXPECT_EQ(copy.get(), before) << "a copy keeps what it has";
        EXPECT_EQ(copy.bufferSize() == step.asked, step.isKept);
    }
    buffer.reset();
    EXPECT_TRUE(buffer.isNull());
    EXPECT_EQ(buffer.get(), nullptr);
    EXPECT_EQ(buffer.capacity() + buffer.bufferSize(), 0U);
}

TEST_F(GpuBuffers, OfAnotherDeviceAreMadeAnew) {
    HOpenCLBuffer buffer;
    ASSERT_EQ(upload<int>({1, 2}, buffer), CL_SUCCESS);
    const HOpenCLBuffer kept = buffer;
    closeDevice();
    ASSERT_EQ(upload<int>({3}, buffer), CL_SUCCESS);
    EXPECT_NE(buffer.get(), kept.get());
    EXPECT_THAT(contents<int>(buffer, 1), ElementsAre(3));
    EXPECT_EQ(kept.bufferSize(), 8U); // and still has its context
    closeDevice();
    EXPECT_EQ(buffer.ensureBufferSize(0), CL_SUCCESS);
    EXPECT_TRUE(buffer.isNull());
}

TEST_F(GpuBuffers, EventsHoldOneReferenceEach) {
    HOpenCLBuffer buffer;
    EXPECT_TRUE(buffer.bufferReadyEvent().isNull());
    ASSERT_EQ(upload<int>({1}, buffer), CL_SUCCESS);
    const std::int64_t before = clshim::liveObjects();
    {
        HOpenCLEvent event = buffer.bufferReadyEvent();
        ASSERT_FALSE(event.isNull());
        HOpenCLEvent copy = event;
        EXPECT_EQ(clshim::liveObjects(), before + 2);
        const HOpenCLEvent moved = std::move(copy);
        copy = event;
        copy = std::move(event);
        EXPECT_EQ(clshim::liveObjects(), before + 2);

        HOpenCLEventList list = {HOpenCLEvent(), moved};
        list.append(HOpenCLEvent());
        list.append(moved);
        EXPECT_EQ(list.length(), 1U);
        EXPECT_EQ(*list.data(), moved.get());
        EXPECT_EQ(HOpenCLEventList().data(), nullptr);
        *copy.receive() = nullptr;
        EXPECT_EQ(clshim::liveObjects(), before + 2);
    }
    EXPECT_EQ(clshim::liveObjects(), before);
}

TEST_F(GpuUploads, HoldWhatTheDataWasAtTheCall) {
    for (const std::size_t count : {std::size_t{1}, std::size_t{1000}, (std::size_t{1} << 18U) + 1}) { // 4 bytes each
        SCOPED_TRACE(count);
        HOpenCLBuffer buffer;
        std::vector<HOpenCLBuffer> seen(8);
        std::vector<int> data(count);
        for (int round = 0; round < 8; ++round) {
            HOpenCLBuffer& copy = seen[static_cast<std::size_t>(round)];
            std::iota(data.begin(), data.end(), round);
            ASSERT_EQ(upload(data, buffer), CL_SUCCESS);
            std::fill(data.begin(), data.end(), -1);
            ASSERT_EQ(copy.ensureBufferSize(buffer.bufferSize()), CL_SUCCESS);
            ASSERT_EQ(clEnqueueCopyBuffer(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue(), buffer.get(), copy.get(), 0,
                                          0, buffer.bufferSize(), 0, nullptr, nullptr),
                      CL_SUCCESS);
        }
        for (int round = 0; round < 8; ++round) {
            std::iota(data.begin(), data.end(), round);
            EXPECT_EQ(contents<int>(seen[static_cast<std::size_t>(round)], count), data) << round;
        }
    }
}

TEST_F(GpuUploads, MayKeepTheDataAndMayBeEmpty) {
    HOpenCLBuffer buffer;
    const std::vector<int> data = {1, 2, 3};
    ASSERT_EQ(upload(data, buffer, HOpenCLUtils::kKeepData), CL_SUCCESS);
    cl_event ready = buffer.bufferReadyEvent().get();
    EXPECT_EQ(clWaitForEvents(1, &ready), CL_SUCCESS);
    EXPECT_EQ(contents<int>(buffer, 3), data);

    for (const int mode : {HOpenCLUtils::kKeepData, HOpenCLUtils::kCopyData}) {
        ASSERT_EQ(upload(data, buffer), CL_SUCCESS);
        EXPECT_EQ(HOpenCLUtils::uploadToGPU(0, nullptr, buffer, mode), CL_SUCCESS);
        EXPECT_EQ(buffer.bufferSize(), 0U);
        EXPECT_EQ(buffer.capacity(), 12U);
        EXPECT_TRUE(buffer.bufferReadyEvent().isNull());
    }
}

TEST_F(GpuUploads, RefuseWhatIsNoUpload) {
    const int value = 1;
    const struct {
        const void* data;
        int mode;
        const char* reason;
    } cases[] = {{nullptr, HOpenCLUtils::kCopyData, "upload: CL_INVALID_VALUE (-30), no data for 4 bytes"},
                 {nullptr, HOpenCLUtils::kKeepData, "upload: CL_INVALID_VALUE (-30), no data for 4 bytes"},
                 {&value, 2, "upload: CL_INVALID_VALUE (-30), mode 2"}};
    for (const auto& refused : cases) {
        HOpenCLBuffer buffer;
        ASSERT_EQ(upload<int>({7}, buffer), CL_SUCCESS);
        EXPECT_EQ(HOpenCLUtils::uploadToGPU(4, refused.data, buffer, refused.mode), CL_INVALID_VALUE);
        EXPECT_TRUE(buffer.isNull());
        EXPECT_EQ(takeFailure(), refused.reason);
    }
}

TEST_F(GpuPositions, GoUpAsFloatsAndComeDownAsDoubles) {
    HOpenCLBuffer buffer;
    for (const std::size_t count : {0U, 1U, 99991U, 5U}) {
        SCOPED_TRACE(count);
        const auto sent = newPositions(count);
        const auto received = newPositions(count);
        std::vector<double> expected(3 * count);
        for (std::size_t i = 0; i < 3 * count; ++i) {
            sent->xyz()[i] = 0.1 * static_cast<double>(i) - 1e4;
            expected[i] = static_cast<float>(sent->xyz()[i]);
        }
        Gpu::resetCounts();
        ASSERT_EQ(stagePositions(*sent, buffer), CL_SUCCESS);
        const bool isStaged = count == 1 || count == 5; // what is small
        EXPECT_EQ(buffer.bufferSize(), 12 * count);
        EXPECT_EQ(buffer.bufferReadyEvent().isNull(), isStaged || count == 0);
        EXPECT_EQ(Gpu::counts().uploads.count("positions"), count > 5 ? 1U : 0U);
        for (const bool isFirst : {true, false}) {
            const std::uint64_t writes = clshim::calls("clEnqueueWriteBuffer");
            ASSERT_EQ(writeStaged(buffer), CL_SUCCESS);
            EXPECT_EQ(clshim::calls("clEnqueueWriteBuffer") - writes, isStaged && isFirst ? 1U : 0U);
        }
        EXPECT_EQ(buffer.bufferReadyEvent().isNull(), count == 0);
        ASSERT_EQ(downloadPositions(buffer, *received), CL_SUCCESS);
        EXPECT_EQ(std::vector<double>(received->xyz(), received->xyz() + 3 * count), expected);
    }
    EXPECT_EQ(downloadPositions(buffer, *newPositions(6)), CL_INVALID_BUFFER_SIZE);
    EXPECT_EQ(takeFailure(), "download: CL_INVALID_BUFFER_SIZE (-61), 72 bytes from a buffer of 60");
    EXPECT_EQ(downloadPositions(HOpenCLBuffer(), *newPositions(1)), CL_INVALID_BUFFER_SIZE);
    takeFailure();
}

TEST_F(GpuCounting, NamesWhatHappenedAndMeasuresWhenAsked) {
    const HString file = write("count.cl", countKernel);
    for (const bool isTimed : {false, true}) {
        Gpu::setTiming(isTimed);
        Gpu::resetCounts();
        HOpenCLBuffer values;
        HOpenCLBuffer named;
        HOpenCLBuffer positions;
        ASSERT_EQ(upload<int>({1, 2, 3}, values), CL_SUCCESS);
        ASSERT_EQ(upload<int>({}, values), CL_SUCCESS); // nothing crosses
        ASSERT_EQ(uploadNamed("Connections", 4, "abcd", named, HOpenCLUtils::kKeepData), CL_SUCCESS);
        const auto points = newPositions(2);
        std::fill(points->xyz(), points->xyz() + 6, 1.0);
        ASSERT_EQ(stagePositions(*points, positions), CL_SUCCESS);
        ASSERT_EQ(writeStaged(positions), CL_SUCCESS);
        ASSERT_EQ(downloadPositions(positions, *points), CL_SUCCESS);
        HOpenCLKernelInfo kernel;
        for (const std::size_t items : {2U, 0U, 1U}) {
            ASSERT_TRUE(kernel.loadOrUpdate(file, "count", items));
            cl_int status = CL_SUCCESS;
            kernel.setKernelArgBuffer(0, positions, status);
            kernel.setKernelArgBuffer(1, positions, status, false);
            ASSERT_EQ(status, CL_SUCCESS);
            ASSERT_EQ(kernel.enqueueKernel({}, nullptr), CL_SUCCESS);
        }
        countEvaluation(true);
        countEvaluation(false);
        countEvaluation(false, true);
        ASSERT_EQ(clFinish(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue()), CL_SUCCESS);

        const GpuCounts counts = Gpu::counts();
        EXPECT_THAT(counts.launches, ElementsAre(Pair("count", 2)));
        EXPECT_THAT(counts.uploads, ElementsAre(Pair("Connections", 1), Pair("positions", 1), Pair("values", 1)));
        EXPECT_EQ(counts.downloads, 1U);
        EXPECT_EQ(counts.bytesUp, 12U + 4 + 24);
        EXPECT_EQ(counts.bytesDown, 24U);
        EXPECT_EQ(counts.gpuEvaluations, 1U);
        EXPECT_EQ(counts.cpuEvaluations, 2U);
        EXPECT_EQ(counts.fallbacks, 1U);
        if (isTimed) {
            EXPECT_THAT(counts.seconds, ElementsAre(Pair("count", testing::Gt(0)), Pair("download", testing::Ge(0)),
                                                    Pair("upload", testing::Gt(0))));
            EXPECT_THAT(counts.hostSeconds, ElementsAre(Pair("download", testing::Gt(0)),
                                                        Pair("upload", testing::Gt(0)), Pair("wait", testing::Ge(0))));
        } else {
            EXPECT_TRUE(counts.seconds.empty() && counts.hostSeconds.empty());
        }
    }
    Gpu::resetCounts();
    EXPECT_TRUE(Gpu::counts().launches.empty());
    EXPECT_EQ(Gpu::counts().bytesUp, 0U);
}

} // namespace
