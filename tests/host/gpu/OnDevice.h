// SPDX-License-Identifier: Apache-2.0
// What the tests share that need a device.
#pragma once

#include "gpu/Device.h"
#include "gpu/failure.h"
#include "openquarn/gpu/HOpenCLInfo.h"
#include "openquarn/gpu/HOpenCLKernelInfo.h"
#include "openquarn/gpu/HOpenCLUtils.h"
#include "openquarn_app/Gpu.h"
#include "support/TemporaryFolder.h"
#include "support/openclShim.h"

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

// Begins and ends with a closed device, and with nothing left on it.
class OnDevice : public testing::Test {
protected:
    void SetUp() override {
        if (OpenQuarn::Gpu::devices().empty())
            GTEST_SKIP() << "there is no OpenCL device";
        live_ = clshim::liveObjects();
    }
    void TearDown() override {
        clshim::heal();
        OpenQuarn::Gpu::setTiming(false);
        OpenQuarn::Gpu::assumeNoDoubles(false);
        OpenQuarn::Gpu::chooseDevice("");
        OpenQuarn::Gpu::resetCounts();
        EXPECT_EQ(clshim::liveObjects(), live_);
        EXPECT_EQ(OpenQuarn::takeFailure(), "");
    }
    std::int64_t liveBefore() const { return live_; }

    // Writes a file below the test's folder, whose time is another each time.
    HString write(const std::string& name, const std::string& text) {
        const std::filesystem::path path = folder_.path() / name;
        std::filesystem::create_directories(path.parent_path());
        std::ofstream(path) << text;
        std::filesystem::last_write_time(path, std::filesystem::file_time_type(std::chrono::seconds(++time_)));
        return path.c_str();
    }
    HString folder(const std::string& name) const { return (folder_.path() / name).c_str(); }

    // `count` elements of the buffer, once everything has run
    template <class T>
    static std::vector<T> contents(const HOpenCLBuffer& buffer, std::size_t count) {
        std::vector<T> values(count);
        const cl_int status =
            count == 0 ? CL_SUCCESS
                       : clEnqueueReadBuffer(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue(), buffer.get(), CL_TRUE, 0,
                                             count * sizeof(T), values.data(), 0, nullptr, nullptr);
        EXPECT_EQ(status, CL_SUCCESS);
        return values;
    }
    template <class T>
    static cl_int upload(const std::vector<T>& values, HOpenCLBuffer& buffer, int mode = HOpenCLUtils::kCopyData) {
        return HOpenCLUtils::uploadToGPU(values.size() * sizeof(T), values.data(), buffer, mode);
    }

private:
    TemporaryFolder folder_;
    std::int64_t live_ = 0;
    int time_ = 0;
};

// adds its index + 1, and what the second argument holds, which may be null
inline const char* const countKernel = "__kernel void count(__global int* to, __global const int* add) {\n"
                                       "    size_t i = get_global_id(0);\n"
                                       "    to[i] += (int)i + 1 + (add ? add[0] : 0);\n"
                                       "}\n";
