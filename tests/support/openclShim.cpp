// SPDX-License-Identifier: Apache-2.0
#include "support/openclShim.h"

#include "openquarn/gpu/opencl.h"

#include <cstdio>
#include <cstdlib>
#include <limits>
#include <map>
#include <mutex>

#include <dlfcn.h>

namespace clshim {
namespace {

struct State {
    std::mutex mutex;
    std::uint64_t calls = 0;
    std::map<std::string, std::uint64_t> callsOf;
    std::int64_t live = 0;
    std::uint64_t firstToFail = 0, endOfFailing = 0; // numbers of calls
    cl_int status = CL_SUCCESS;
    std::string function; // the only one whose calls fail; "" for all
    std::string failed;
};

State& state() {
    static State& theState = *new State; // the last calls come late
    return theState;
}

// Counts the call; the status it has to fail with, or success.
cl_int begin(const char* function) {
    State& all = state();
    const std::scoped_lock lock(all.mutex);
    const std::uint64_t ofFunction = ++all.callsOf[function];
    ++all.calls;
    const std::uint64_t number = all.function.empty() ? all.calls : ofFunction;
    const bool isMeant = all.function.empty() || all.function == function;
    if (!isMeant || number < all.firstToFail || number >= all.endOfFailing)
        return CL_SUCCESS;
    all.failed = function;
    return all.status;
}

void countObjects(std::int64_t more) {
    const std::scoped_lock lock(state().mutex);
    state().live += more;
}

void* realFunction(const char* name) {
    static void* loader = dlopen("libOpenCL.so.1", RTLD_NOW);
    void* found = loader ? dlsym(loader, name) : nullptr;
    if (found)
        return found;
    std::fprintf(stderr, "the OpenCL loader has no %s\n", name);
    std::abort();
}

void failFrom(std::uint64_t number, cl_int status, std::uint64_t times, const std::string& function = {}) {
    State& all = state();
    const std::scoped_lock lock(all.mutex);
    const std::uint64_t calls = function.empty() ? all.calls : all.callsOf[function];
    const std::uint64_t most = std::numeric_limits<std::uint64_t>::max() - calls - number;
    all.function = function;
    all.firstToFail = calls + number;
    all.endOfFailing = all.firstToFail + (times < most ? times : most);
    all.status = status;
    all.failed.clear();
}

} // namespace

std::uint64_t calls() {
    const std::scoped_lock lock(state().mutex);
    return state().calls;
}

std::uint64_t calls(const std::string& function) {
    const std::scoped_lock lock(state().mutex);
    const auto found = state().callsOf.find(function);
    return found == state().callsOf.end() ? 0 : found->second;
}

std::int64_t liveObjects() {
    const std::scoped_lock lock(state().mutex);
    return state().live;
}

void failCall(std::uint64_t number, int status, std::uint64_t times) {
    failFrom(number, status, times);
}

void failCallOf(const std::string& function, std::uint64_t number, int status) {
    failFrom(number, status, 1, function);
}

void loseDevice() {
    failFrom(1, CL_DEVICE_NOT_AVAILABLE, std::numeric_limits<std::uint64_t>::max());
}

void heal() {
    failFrom(0, CL_SUCCESS, 0);
}

std::string failedCall() {
    const std::scoped_lock lock(state().mutex);
    return state().failed;
}

} // namespace clshim

// --- the functions: a row each, but for clGetEventInfo, which is called as often as a command takes ---
#define SHIM extern "C" __attribute__((visibility("default")))
#define REAL(name)                                                                                                     \
    static const auto real = reinterpret_cast<decltype(&(name))>(clshim::realFunction(#name)); /* NOLINT */

// answers with a status, and makes `made` references when it succeeds
#define CALL(name, parameters, arguments, made)                                                                        \
    SHIM cl_int name parameters {                                                                                      \
        REAL(name)                                                                                                     \
        if (const cl_int failure = clshim::begin(#name); failure != CL_SUCCESS)                                        \
            return failure;                                                                                            \
        const cl_int status = real arguments;                                                                          \
        if (status == CL_SUCCESS)                                                                                      \
            clshim::countObjects(made);                                                                                \
        return status;                                                                                                 \
    }
// releases a reference, also when it has to fail
#define RELEASE(name, type)                                                                                            \
    SHIM cl_int name(type object) {                                                                                    \
        REAL(name)                                                                                                     \
        const cl_int failure = clshim::begin(#name);                                                                   \
        const cl_int status = real(object);                                                                            \
        if (status == CL_SUCCESS)                                                                                      \
            clshim::countObjects(-1);                                                                                  \
        return failure != CL_SUCCESS ? failure : status;                                                               \
    }
// answers with what it makes: `made` references
#define MAKE(type, name, parameters, arguments, made)                                                                  \
    SHIM type name parameters {                                                                                        \
        REAL(name)                                                                                                     \
        if (const cl_int failure = clshim::begin(#name); failure != CL_SUCCESS) {                                      \
            if (error)                                                                                                 \
                *error = failure;                                                                                      \
            return nullptr;                                                                                            \
        }                                                                                                              \
        auto* result = real arguments;                                                                                 \
        if (result)                                                                                                    \
            clshim::countObjects(made);                                                                                \
        return result;                                                                                                 \
    }
#define EVENTS cl_uint waits, const cl_event *waitFor, cl_event *event
#define EVENT_MADE (event ? 1 : 0)

// clang-format off
CALL(clGetPlatformIDs, (cl_uint room, cl_platform_id* to, cl_uint* count), (room, to, count), 0)
CALL(clGetPlatformInfo, (cl_platform_id id, cl_platform_info what, size_t size, void* to, size_t* needed), (id, what, size, to, needed), 0)
CALL(clGetDeviceIDs, (cl_platform_id id, cl_device_type type, cl_uint room, cl_device_id* to, cl_uint* count), (id, type, room, to, count), 0)
CALL(clGetDeviceInfo, (cl_device_id id, cl_device_info what, size_t size, void* to, size_t* needed), (id, what, size, to, needed), 0)
MAKE(cl_context, clCreateContext, (const cl_context_properties* properties, cl_uint count, const cl_device_id* devices, void (CL_CALLBACK* notify)(const char*, const void*, size_t, void*), void* data, cl_int* error), (properties, count, devices, notify, data, error), 1)
RELEASE(clReleaseContext, cl_context)
MAKE(cl_command_queue, clCreateCommandQueue, (cl_context context, cl_device_id device, cl_command_queue_properties properties, cl_int* error), (context, device, properties, error), 1)
RELEASE(clReleaseCommandQueue, cl_command_queue)
MAKE(cl_program, clCreateProgramWithSource, (cl_context context, cl_uint count, const char** texts, const size_t* lengths, cl_int* error), (context, count, texts, lengths, error), 1)
CALL(clBuildProgram, (cl_program program, cl_uint count, const cl_device_id* devices, const char* options, void (CL_CALLBACK* notify)(cl_program, void*), void* data), (program, count, devices, options, notify, data), 0)
CALL(clGetProgramBuildInfo, (cl_program program, cl_device_id device, cl_program_build_info what, size_t size, void* to, size_t* needed), (program, device, what, size, to, needed), 0)
RELEASE(clReleaseProgram, cl_program)
MAKE(cl_kernel, clCreateKernel, (cl_program program, const char* kernel, cl_int* error), (program, kernel, error), 1)
CALL(clSetKernelArg, (cl_kernel kernel, cl_uint index, size_t size, const void* value), (kernel, index, size, value), 0)
CALL(clGetKernelWorkGroupInfo, (cl_kernel kernel, cl_device_id device, cl_kernel_work_group_info what, size_t size, void* to, size_t* needed), (kernel, device, what, size, to, needed), 0)
RELEASE(clReleaseKernel, cl_kernel)
MAKE(cl_mem, clCreateBuffer, (cl_context context, cl_mem_flags flags, size_t size, void* host, cl_int* error), (context, flags, size, host, error), 1)
CALL(clRetainMemObject, (cl_mem memory), (memory), 1)
RELEASE(clReleaseMemObject, cl_mem)
CALL(clEnqueueNDRangeKernel, (cl_command_queue queue, cl_kernel kernel, cl_uint dimensions, const size_t* offset, const size_t* global, const size_t* local, EVENTS), (queue, kernel, dimensions, offset, global, local, waits, waitFor, event), EVENT_MADE)
CALL(clEnqueueMarkerWithWaitList, (cl_command_queue queue, EVENTS), (queue, waits, waitFor, event), EVENT_MADE)
CALL(clEnqueueReadBuffer, (cl_command_queue queue, cl_mem memory, cl_bool blocks, size_t offset, size_t size, void* to, EVENTS), (queue, memory, blocks, offset, size, to, waits, waitFor, event), EVENT_MADE)
CALL(clEnqueueWriteBuffer, (cl_command_queue queue, cl_mem memory, cl_bool blocks, size_t offset, size_t size, const void* from, EVENTS), (queue, memory, blocks, offset, size, from, waits, waitFor, event), EVENT_MADE)
CALL(clEnqueueFillBuffer, (cl_command_queue queue, cl_mem memory, const void* pattern, size_t patternSize, size_t offset, size_t size, EVENTS), (queue, memory, pattern, patternSize, offset, size, waits, waitFor, event), EVENT_MADE)
CALL(clEnqueueCopyBuffer, (cl_command_queue queue, cl_mem from, cl_mem to, size_t fromOffset, size_t toOffset, size_t size, EVENTS), (queue, from, to, fromOffset, toOffset, size, waits, waitFor, event), EVENT_MADE)
MAKE(void*, clEnqueueMapBuffer, (cl_command_queue queue, cl_mem memory, cl_bool blocks, cl_map_flags flags, size_t offset, size_t size, EVENTS, cl_int* error), (queue, memory, blocks, flags, offset, size, waits, waitFor, event, error), EVENT_MADE)
CALL(clEnqueueUnmapMemObject, (cl_command_queue queue, cl_mem memory, void* mapped, EVENTS), (queue, memory, mapped, waits, waitFor, event), EVENT_MADE)
CALL(clFlush, (cl_command_queue queue), (queue), 0)
CALL(clFinish, (cl_command_queue queue), (queue), 0)
CALL(clWaitForEvents, (cl_uint count, const cl_event* events), (count, events), 0)
CALL(clGetEventProfilingInfo, (cl_event event, cl_profiling_info what, size_t size, void* to, size_t* needed), (event, what, size, to, needed), 0)
CALL(clRetainEvent, (cl_event event), (event), 1)
RELEASE(clReleaseEvent, cl_event)
// clang-format on
