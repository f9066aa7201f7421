// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HOpenCLInfo.h"

#include "gpu/Device.h"
#include "gpu/failure.h"

#include <exception>
#include <string>
#include <string_view>

cl_command_queue HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue() noexcept {
    try {
        const auto device = OpenQuarn::currentDevice();
        return device ? device->queue : nullptr;
    } catch (const std::exception& error) {
        OpenQuarn::noteFailure(error.what());
        return nullptr;
    }
}

void HOpenCLInfo::explainFailure(const char* reason) noexcept {
    OpenQuarn::noteFailure(std::string_view(reason ? reason : ""));
}

cl_int HOpenCLInfo::checkCLErrorStatus(cl_int status, const char* file, int line) noexcept {
    if (status == CL_SUCCESS)
        return status;
    try {
        std::string_view name = file ? file : "";
        name.remove_prefix(name.rfind('/') + 1); // npos + 1 is 0
        std::string place(name);
        place.append(":").append(std::to_string(line));
        OpenQuarn::noteFailure(status, "an OpenCL call", place);
    } catch (const std::exception&) {
        OpenQuarn::noteFailure(status, "an OpenCL call");
    }
    return status;
}

// NOLINTNEXTLINE(readability-function-size): a table
const char* HOpenCLInfo::statusName(cl_int status) noexcept {
#define NAME(status)                                                                                                   \
    case status:                                                                                                       \
        return #status;
    switch (status) {
        NAME(CL_SUCCESS)
        NAME(CL_DEVICE_NOT_FOUND)
        NAME(CL_DEVICE_NOT_AVAILABLE)
        NAME(CL_COMPILER_NOT_AVAILABLE)
        NAME(CL_MEM_OBJECT_ALLOCATION_FAILURE)
        NAME(CL_OUT_OF_RESOURCES)
        NAME(CL_OUT_OF_HOST_MEMORY)
        NAME(CL_PROFILING_INFO_NOT_AVAILABLE)
        NAME(CL_MEM_COPY_OVERLAP)
        NAME(CL_IMAGE_FORMAT_MISMATCH)
        NAME(CL_IMAGE_FORMAT_NOT_SUPPORTED)
        NAME(CL_BUILD_PROGRAM_FAILURE)
        NAME(CL_MAP_FAILURE)
        NAME(CL_MISALIGNED_SUB_BUFFER_OFFSET)
        NAME(CL_EXEC_STATUS_ERROR_FOR_EVENTS_IN_WAIT_LIST)
        NAME(CL_COMPILE_PROGRAM_FAILURE)
        NAME(CL_LINKER_NOT_AVAILABLE)
        NAME(CL_LINK_PROGRAM_FAILURE)
        NAME(CL_DEVICE_PARTITION_FAILED)
        NAME(CL_KERNEL_ARG_INFO_NOT_AVAILABLE)
        NAME(CL_INVALID_VALUE)
        NAME(CL_INVALID_DEVICE_TYPE)
        NAME(CL_INVALID_PLATFORM)
        NAME(CL_INVALID_DEVICE)
        NAME(CL_INVALID_CONTEXT)
        NAME(CL_INVALID_QUEUE_PROPERTIES)
        NAME(CL_INVALID_COMMAND_QUEUE)
        NAME(CL_INVALID_HOST_PTR)
        NAME(CL_INVALID_MEM_OBJECT)
        NAME(CL_INVALID_IMAGE_FORMAT_DESCRIPTOR)
        NAME(CL_INVALID_IMAGE_SIZE)
        NAME(CL_INVALID_SAMPLER)
        NAME(CL_INVALID_BINARY)
        NAME(CL_INVALID_BUILD_OPTIONS)
        NAME(CL_INVALID_PROGRAM)
        NAME(CL_INVALID_PROGRAM_EXECUTABLE)
        NAME(CL_INVALID_KERNEL_NAME)
        NAME(CL_INVALID_KERNEL_DEFINITION)
        NAME(CL_INVALID_KERNEL)
        NAME(CL_INVALID_ARG_INDEX)
        NAME(CL_INVALID_ARG_VALUE)
        NAME(CL_INVALID_ARG_SIZE)
        NAME(CL_INVALID_KERNEL_ARGS)
        NAME(CL_INVALID_WORK_DIMENSION)
        NAME(CL_INVALID_WORK_GROUP_SIZE)
        NAME(CL_INVALID_WORK_ITEM_SIZE)
        NAME(CL_INVALID_GLOBAL_OFFSET)
        NAME(CL_INVALID_EVENT_WAIT_LIST)
        NAME(CL_INVALID_EVENT)
        NAME(CL_INVALID_OPERATION)
        NAME(CL_INVALID_GL_OBJECT)
        NAME(CL_INVALID_BUFFER_SIZE)
        NAME(CL_INVALID_MIP_LEVEL)
        NAME(CL_INVALID_GLOBAL_WORK_SIZE)
        NAME(CL_INVALID_PROPERTY)
        NAME(CL_INVALID_IMAGE_DESCRIPTOR)
        NAME(CL_INVALID_COMPILER_OPTIONS)
        NAME(CL_INVALID_LINKER_OPTIONS)
        NAME(CL_INVALID_DEVICE_PARTITION_COUNT)
    default:
        return "unknown status";
    }
#undef NAME
}
