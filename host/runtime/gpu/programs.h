// SPDX-License-Identifier: Apache-2.0
// Compiled programs, each kept until its files change or the device is closed. Thread: any.
#pragma once

#include "openquarn/HStringArray.h"
#include "openquarn/gpu/opencl.h"

#include <cstdint>
#include <memory>
#include <string>

namespace OpenQuarn {

struct Device;

struct Program {
    Program() = default;
    ~Program();
    Program(const Program&) = delete;
    Program& operator=(const Program&) = delete;

    std::shared_ptr<Device> device;
    cl_program id = nullptr;
};

/// The program of a file on the current device, compiled when it is not there or its files have changed. Null, with the
/// reason noted, when it cannot be; a text that does not compile is compiled again only when it has changed.
/// `includes` may be null.
std::shared_ptr<const Program> loadProgram(const std::string& file, const HStringArray* includes);

/// While one lives, its thread looks at the files of each program once.
class OneLook {
public:
    OneLook() noexcept;
    ~OneLook();
    OneLook(const OneLook&) = delete;
    OneLook& operator=(const OneLook&) = delete;

private:
    std::uint64_t before_;
};

/// Forgets all programs; who uses one keeps it.
void forgetPrograms();

/// Compiles from now on as for a device without double precision.
void compileWithoutDoubles(bool without);

} // namespace OpenQuarn
