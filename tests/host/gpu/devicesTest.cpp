// SPDX-License-Identifier: Apache-2.0
#include "OnDevice.h"

#include "gpu/deviceList.h"
#include "openquarn_app/Session.h"

#include <gmock/gmock.h>

#include <stdexcept>

using namespace OpenQuarn;
using testing::AllOf;
using testing::HasSubstr;

namespace {

using GpuDevices = OnDevice;

TEST(GpuDeviceChoice, IsANumberOrAPartOfAName) {
    const std::vector<GpuDevice> devices = {{"Fast 3000", "Vendor", "", true, true, 0},
                                            {"Slow 3000", "Vendor", "", true, false, 0},
                                            {"CPU", "Port", "", false, true, 0}};
    const struct {
        const char* choice;
        std::optional<std::size_t> expected;
    } cases[] = {{"", 0},      {"0", 0},    {"2", 2},      {"3", 0 /* part of "Fast 3000" */},
                 {"3000", 0},  {"sLOW", 1}, {"vendor", 0}, {"pOrT", 2},
                 {"none", {}}, {"-1", {}},  {"2 ", {}},    {"99999999999999999999999", {}}};
    for (const auto& each : cases)
        EXPECT_EQ(matchDevice(devices, each.choice), each.expected) << each.choice;
    EXPECT_EQ(matchDevice({}, "0"), std::nullopt);
    EXPECT_EQ(listDevices(devices),
              "the OpenCL devices are 0: Fast 3000 (Vendor), 1: Slow 3000 (Vendor), 2: CPU (Port)");
}

TEST_F(GpuDevices, AreDescribedAndOpenedOnFirstUse) {
    const std::vector<GpuDevice> devices = Gpu::devices();
    const auto isNoGpu = [](const GpuDevice& device) { return !device.isGpu; };
    EXPECT_TRUE(std::is_partitioned(devices.rbegin(), devices.rend(), isNoGpu)) << "GPUs come first";
    EXPECT_FALSE(devices[0].name.empty() || devices[0].platform.empty() || devices[0].driver.empty());
    EXPECT_GT(devices[0].memory, 0U);

    EXPECT_FALSE(Gpu::currentDevice());
    const auto opened = currentDevice();
    ASSERT_TRUE(opened);
    EXPECT_EQ(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue(), opened->queue);
    EXPECT_EQ(Gpu::currentDevice()->name, devices[0].name);
    EXPECT_EQ(currentDevice(), opened);
    closeDevice();
    EXPECT_FALSE(Gpu::currentDevice());
    EXPECT_NE(currentDevice(), opened);
    { const Session session; }
    EXPECT_FALSE(Gpu::currentDevice()) << "the end of a session closes it";
}

TEST_F(GpuDevices, AChoiceClosesTheDeviceAndARefusedOneDoesNot) {
    const std::string name = Gpu::devices()[0].name;
    Gpu::chooseDevice(name);
    const auto opened = currentDevice();
    ASSERT_TRUE(opened);
    try {
        Gpu::chooseDevice("no such thing");
        ADD_FAILURE() << "was chosen";
    } catch (const std::invalid_argument& error) {
        EXPECT_THAT(error.what(), AllOf(HasSubstr("\"no such thing\""), HasSubstr("0: " + name)));
    }
    EXPECT_EQ(openDevice(), opened);
    Gpu::chooseDevice("0");
    EXPECT_EQ(openDevice(), nullptr);
    EXPECT_EQ(currentDevice()->name, name);
    Gpu::setTiming(false); // no change
    EXPECT_NE(openDevice(), nullptr);
    Gpu::setTiming(true);
    EXPECT_EQ(openDevice(), nullptr);
}

} // namespace
