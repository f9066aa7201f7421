// SPDX-License-Identifier: Apache-2.0
// OpenCL's own header, in the version that the host is written for.
#pragma once

#ifndef CL_TARGET_OPENCL_VERSION
#define CL_TARGET_OPENCL_VERSION 120
#endif
#include <CL/cl.h>
