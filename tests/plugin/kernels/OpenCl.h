// SPDX-License-Identifier: Apache-2.0
#pragma once

#ifndef CL_TARGET_OPENCL_VERSION
#define CL_TARGET_OPENCL_VERSION 120
#endif
#include <CL/cl.h>

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <type_traits>
#include <vector>

// Plain OpenCL for tests and benchmarks of the kernels. Every failing call throws a std::runtime_error that names it.
namespace kernels {

struct Release {
    void operator()(cl_context o) const { clReleaseContext(o); }
    void operator()(cl_command_queue o) const { clReleaseCommandQueue(o); }
    void operator()(cl_program o) const { clReleaseProgram(o); }
    void operator()(cl_kernel o) const { clReleaseKernel(o); }
    void operator()(cl_mem o) const { clReleaseMemObject(o); }
};
template <typename Handle>
using Owned = std::unique_ptr<std::remove_pointer_t<Handle>, Release>;

void check(cl_int status, const char* call);

// Where the sources are.
const char* folder();

// The first device of any kind, with an in-order queue.
struct Device {
    // Null when there is none.
    static std::unique_ptr<Device> first();
    bool hasDoubles() const;
    // Square roots and quotients can be, and are with programs' options, as exact as the processor's.
    bool isExact() const;
    bool keepsDenormals() const;

    cl_device_id id = nullptr;
    Owned<cl_context> context;
    Owned<cl_command_queue> queue;
};

class Program {
public:
    // A file of the kernel folder. withIncludes: that folder is the place of includes.
    Program(const Device& device, const std::string& file, bool withIncludes, const std::string& options = "");
    static Program fromText(const Device& device, const std::string& name, const std::string& text,
                            const std::string& options = "");
    const std::string& log() const { return log_; }
    Owned<cl_kernel> kernel(const char* name) const;

private:
    Program() = default;
    Owned<cl_program> program_;
    std::string log_;
};

// Memory on the device between two guards of 0xFF bytes: NaN as floats, no index as integers, so that a read beyond an
// end shows in results, and a write in the guards.
class Buffer {
public:
    template <typename T>
    Buffer(const Device& device, const std::vector<T>& contents)
        : Buffer(device, contents.data(), contents.size() * sizeof(T)) {}
    Buffer(const Device& device, const void* contents, std::size_t bytes);

    cl_mem handle() const { return payload_.get(); }
    template <typename T>
    std::vector<T> read() const {
        std::vector<T> values(bytes_ / sizeof(T));
        readPayload(values.data());
        return values;
    }
    void write(const void* contents);
    bool guardsAreWhole() const;
    // The payload is still what was last written from here.
    bool isUnchanged() const;

private:
    void readPayload(void* to) const;

    const Device& device_;
    std::size_t bytes_;
    std::vector<unsigned char> written_;
    Owned<cl_mem> whole_, payload_;
};

// The arguments of one launch, in order.
class Arguments {
public:
    explicit Arguments(cl_kernel kernel)
        : kernel_(kernel) {}
    Arguments& add(const Buffer* buffer); // null: a null buffer
    Arguments& add(const Buffer& buffer) { return add(&buffer); }
    Arguments& add(std::uint32_t value) { return add(&value, sizeof value); }
    Arguments& add(std::uint64_t value) { return add(&value, sizeof value); }
    Arguments& add(float value) { return add(&value, sizeof value); }
    Arguments& add(const void* value, std::size_t size);

private:
    cl_kernel kernel_;
    cl_uint index_ = 0;
};

// One work item for each of n elements, and as many beyond as fill the last group of `local`.
void enqueue(const Device& device, cl_kernel kernel, std::size_t n, std::size_t local);
void finish(const Device& device);

} // namespace kernels
