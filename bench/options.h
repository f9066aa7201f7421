// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdio>
#include <memory>
#include <optional>
#include <string>

namespace bench {

struct CloseFile {
    void operator()(std::FILE* file) const { std::fclose(file); }
};

// What every benchmark program takes on its command line.
struct Options {
    double seconds = 0.4; // for each row
    std::string only;     // phases whose name begins so
    bool isQuick = false; // fewer and shorter rows, where a program has many
    bool wants(const std::string& phase) const { return phase.rfind(only, 0) == 0; }
    std::string device; // an OpenCL device, as Gpu::chooseDevice() takes it
    std::string csvPath;
    std::unique_ptr<std::FILE, CloseFile> csv; // opened for writing
};

// Reads the arguments and opens the CSV file. Nothing when they make no sense or the file cannot be written, after a
// message on standard error.
std::optional<Options> readOptions(int argc, char** argv);

} // namespace bench
