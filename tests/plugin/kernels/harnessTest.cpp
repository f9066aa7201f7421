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

TEST_F(Harness, EverySourceCompilesWithoutAWordAndHasItsKernels) {
    struct Source {
        const char* file;
        bool withIncludes;
        std::vector<std::pair<const char*, cl_uint>> kernels; // and their numbers of arguments
    };
    const Source sources[] = {
        {"quillBuffers.cl", false, {{"copyToAffectBuffer", 4}}},
        {"quillUtils.cl", true, {{"averageVertKernel", 8}}},
        {"neuralWarpGPUNode.cl", true, {{"gpu_principal_shapes_kernel", 5}, {"gpu_apply_deltas_kernel", 16}}}};
    for (const Source& source : sources)
        for (const char* options : {"", "-D NW_WITHOUT_DOUBLES", "-cl-std=CL1.2"}) {
            const kernels::Program program(*device(), source.file, source.withIncludes, options);
            EXPECT_EQ(program.log(), "") << source.file << " with " << options;
            for (const auto& [name, count] : source.kernels) {
                cl_uint found = 0;
                const auto kernel = program.kernel(name);
                kernels::check(clGetKernelInfo(kernel.get(), CL_KERNEL_NUM_ARGS, sizeof found, &found, nullptr), name);
                EXPECT_EQ(found, count) << name;
            }
        }
}

} // namespace
