// SPDX-License-Identifier: Apache-2.0
// The harness sees what it is there to see, and the sources compile as the host compiles them.
#include "KernelTest.h"

namespace {

using Harness = KernelTest;

TEST_F(Harness, SeesWritesBesideTheOutputAndIntoInputs) {
    const auto program = kernels::Program::fromText(
        *device(), "stray", "kernel void stray(global int* to, uint at) { if (!get_global_id(0)) to[(int)at] = 5; }");
    const std::vector<std::int32_t> eight(8, 1);
    for (const int at : {-1, 0, 7, 8}) {
        const kernels::Buffer buffer(*device(), eight);
        const auto kernel = program.kernel("stray");
        kernels::Arguments(kernel.get()).add(buffer).add(static_cast<std::uint32_t>(at));
        kernels::enqueue(*device(), kernel.get(), 1, 1);
        kernels::finish(*device());
        EXPECT_EQ(buffer.guardsAreWhole(), at >= 0 && at < 8) << at;
        EXPECT_EQ(buffer.isUnchanged(), at < 0 || at >= 8) << at;
    }
}

TEST_F(Harness, EverySourceCompilesWithoutAWord) {
    for (const std::string file : {"quillBuffers.cl", "quillUtils.cl", "neuralWarpGPUNode.cl"})
        for (const char* options : {"", "-D NW_WITHOUT_DOUBLES", "-cl-std=CL1.2"}) {
            const kernels::Program program(*device(), file, file != "quillBuffers.cl", options);
            EXPECT_EQ(program.log(), "") << file << " with " << options;
        }
}

} // namespace
