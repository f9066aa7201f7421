// SPDX-License-Identifier: Apache-2.0
// Whatever fails on the device: the frame is the CPU's, one message says what failed, nothing stays behind, and the
// next frame is made on the device again.
#include "plugin/deformer/gpu/ParityTest.h"

#include "openquarn/gpu/opencl.h"
#include "openquarn_app/Resources.h"
#include "plugin/deformer/gpu/testDevice.h"
#include "support/openclShim.h"

#include <functional>
#include <limits>
#include <set>

namespace {

using namespace parity;
using OpenQuarn::Gpu;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

/// What a frame can do without: it may be made on the device all the same. Commands run in their order also where an
/// event is missing; where a buffer goes and its upload cannot be waited for, what it reads is kept for good. Who waits
/// for a command has it sent off anyway.
const std::set<std::string> notVital = {
    "clReleaseMemObject", "clReleaseEvent", "clReleaseKernel", "clReleaseProgram", "clReleaseCommandQueue",
    "clReleaseContext",   "clRetainEvent",  "clWaitForEvents", "clGetDeviceInfo",  "clFlush"};

class FaultSweep : public ParityTest {
protected:
    void SetUp() override {
        ParityTest::SetUp();
        if (IsSkipped())
            return;
        leaveDevice();
        liveBefore_ = clshim::liveObjects();
    }
    void TearDown() override {
        clshim::heal();
        OpenQuarn::Resources::setPath("");
        leaveDevice();
        EXPECT_EQ(clshim::liveObjects(), liveBefore_);
    }

    static Wish everything() {
        return {{{.mesh = makeGrid(6, 5),
                  .deltaMode = 1,
                  .passes = 2,
                  .shapes = 2,
                  .isPart = true,
                  .isOtherPart = true,
                  .isWeighted = true}},
                0.75,
                0.5};
    }
    /// A scene, or the last of two, with what two poses come to on each evaluator.
    void make(unsigned deformers) {
        for (unsigned i = 0; i < deformers; ++i) {
            Wish wish = everything();
            wish.geometries[0].isPart = i == 0; // the tag is of the mesh that comes in first
            scenes_.push_back(std::make_unique<Scene>(folder.path(), i, wish, "warp" + std::to_string(i + 1),
                                                      i == 0 ? nullptr : scenes_.back().get()));
        }
        prime(last());
        for (Pose& pose : poses_) {
            take(pose);
            const Frame gpu = evaluated(last());
            EXPECT_EQ(gpu.counts.cpuEvaluations, 0U);
            pose.onDevice = gpu.points;
            pose.onCpu = deformed(last());
            EXPECT_FALSE(areSame(pose.onDevice, pose.onCpu)) << "it would not show who made a frame";
        }
        EXPECT_THAT(takeMessages(), IsEmpty());
    }
    const Scene& last() const { return *scenes_.back(); }

    /// The next frame: the other pose. True when it is that of the device, false when it is that of the CPU.
    bool nextIsOnDevice() {
        const Pose& pose = poses_[++frame_ % 2];
        take(pose);
        const Frame frame = evaluated(last());
        EXPECT_EQ(frame.status, HStatus::kSuccess);
        const bool isOnDevice = frame.counts.cpuEvaluations == 0;
        EXPECT_EQ(frame.counts.fallbacks, isOnDevice ? 0U : 1U);
        EXPECT_TRUE(areSame(frame.points, isOnDevice ? pose.onDevice : pose.onCpu));
        return isOnDevice;
    }

    /// One frame in which what `arm` asks the shim for fails, and the next one. False when nothing failed.
    bool survives(const std::function<void()>& arm, bool isNamed = true) {
        arm();
        const bool isOnDevice = nextIsOnDevice();
        const std::string call = clshim::failedCall();
        clshim::heal();
        if (call.empty())
            return false;
        SCOPED_TRACE(call);
        (isOnDevice ? stayed_ : failed_).insert(call);
        expectMessage(isOnDevice, isNamed ? call : "");
        EXPECT_TRUE(nextIsOnDevice()) << "the next frame";
        EXPECT_TRUE(nextIsOnDevice()); // which lets go of the events of what the one before uploaded anew
        EXPECT_THAT(takeMessages(), IsEmpty());
        EXPECT_LE(clshim::liveObjects(), live_);
        return !HasFailure();
    }
    /// Has every `step`-th call of a frame fail in turn, `times` calls each; `before` each of these frames.
    void sweep(const std::function<void()>& before, std::uint64_t least, std::uint64_t step = 1,
               std::uint64_t times = 1) {
        EXPECT_TRUE(nextIsOnDevice() && nextIsOnDevice());
        live_ = clshim::liveObjects();
        std::uint64_t number = 1;
        const auto arm = [&] {
            before();
            clshim::failCall(number, CL_OUT_OF_RESOURCES, times);
        };
        while (survives(arm, times == 1))
            number += step;
        EXPECT_GT(number, least) << "too few calls were tried";
        EXPECT_THAT(stayed_, testing::IsSubsetOf(notVital));
    }
    const std::set<std::string>& failed() const { return failed_; }

    /// Takes everything from the device, and closes it.
    static void leaveDevice() {
        Gpu::setEnabled(false);
        chooseTestDevice();
        Gpu::setEnabled(true);
    }

private:
    struct Pose {
        std::uint32_t seed;
        HPointArray onDevice = {}, onCpu = {};
    };
    void take(const Pose& pose) const {
        for (const auto& scene : scenes_)
            scene->pose(pose.seed);
    }
    void expectMessage(bool isOnDevice, const std::string& call) {
        const Texts said = takeMessages();
        if (isOnDevice) {
            EXPECT_THAT(said, IsEmpty());
            return;
        }
        // the deformer's own call is known by its place
        const std::string name = call == "clEnqueueCopyBuffer" ? "" : call;
        EXPECT_THAT(said, ElementsAre(testing::AllOf(HasSubstr("evaluated on the CPU: "), HasSubstr(name),
                                                     HasSubstr("CL_OUT_OF_RESOURCES"))));
    }

    std::vector<std::unique_ptr<Scene>> scenes_;
    Pose poses_[2] = {{100}, {200}};
    unsigned frame_ = 0;
    std::int64_t liveBefore_ = 0, live_ = 0;
    std::set<std::string> stayed_, failed_; ///< calls whose failure the device, or the CPU, made up for
};

TEST_F(FaultSweep, OfTheCallsThatOpenTheDevice) {
    make(1);
    sweep([] {}, 0, 1000); // takes stock of what there is
    for (const char* function :
         {"clGetPlatformIDs", "clGetDeviceIDs", "clGetDeviceInfo", "clCreateContext", "clCreateCommandQueue",
          "clCreateProgramWithSource", "clBuildProgram", "clReleaseProgram", "clReleaseCommandQueue"}) {
        std::uint64_t number = 1;
        const auto arm = [&] {
            clshim::failCallOf(function, number, CL_OUT_OF_RESOURCES);
            chooseTestDevice();
        };
        while (survives(arm))
            ++number;
        EXPECT_GT(number, 1U) << function << " is not called";
    }
}

TEST_F(FaultSweep, OfTheCallsOfTheFirstFrame) {
    make(1);
    const auto makeFirst = [&] {
        Gpu::setEnabled(false);
        Gpu::setEnabled(true);
        deformed(last());
    };
    sweep(makeFirst, 200);
    EXPECT_THAT(failed(), testing::IsSupersetOf({"clCreateBuffer", "clCreateKernel", "clGetKernelWorkGroupInfo"}));
}

TEST_F(FaultSweep, OfTheCallsOfTwoDeformers) {
    make(2);
    sweep([] {}, 250);
    EXPECT_THAT(failed(), testing::Contains("clEnqueueNDRangeKernel"));
}

TEST_F(FaultSweep, OfADeviceThatIsLostInAFrame) {
    make(1);
    sweep([] {}, 150, 13, std::numeric_limits<std::uint64_t>::max() / 2);
}

TEST_F(FaultSweep, ALostDeviceIsToldOfOnce) {
    make(1);
    for (int loss = 0; loss < 2; ++loss) {
        EXPECT_TRUE(nextIsOnDevice());
        clshim::loseDevice();
        for (int frame = 0; frame < 4; ++frame)
            EXPECT_FALSE(nextIsOnDevice());
        clshim::heal();
        EXPECT_THAT(takeMessages(), ElementsAre(HasSubstr("'warp1.outputGeom[0]' is evaluated on the CPU: ")));
        EXPECT_TRUE(nextIsOnDevice());
    }
}

TEST_F(FaultSweep, AKernelFileThatIsNotThere) {
    make(1);
    const std::filesystem::path resources = folder.path() / "resources";
    const std::filesystem::path kernels = resources / "GPUBuiltInDeformer" / "kernels";
    std::filesystem::create_directories(kernels);
    for (const auto& file :
         std::filesystem::directory_iterator(OpenQuarn::Resources::path() + "/GPUBuiltInDeformer/kernels"))
        std::filesystem::copy_file(std::filesystem::canonical(file.path()), kernels / file.path().filename());
    OpenQuarn::Resources::setPath(resources);
    std::set<std::string> tried;
    for (const auto& file : std::filesystem::directory_iterator(kernels))
        tried.insert(file.path().filename());
    EXPECT_GE(tried.size(), 6U);
    for (const std::string& name : tried) {
        SCOPED_TRACE(name);
        EXPECT_TRUE(nextIsOnDevice());
        std::filesystem::rename(kernels / name, folder.path() / name);
        EXPECT_FALSE(nextIsOnDevice());
        EXPECT_FALSE(nextIsOnDevice());
        EXPECT_THAT(
            takeMessages(),
            ElementsAre(testing::AllOf(HasSubstr("'warp1.outputGeom[0]' is evaluated on the CPU: "), HasSubstr(name))));
        std::filesystem::rename(folder.path() / name, kernels / name);
    }
    EXPECT_TRUE(nextIsOnDevice());
}

} // namespace
