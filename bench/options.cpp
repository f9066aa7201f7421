// SPDX-License-Identifier: Apache-2.0
#include "options.h"

#include <cstdlib>
#include <filesystem>

namespace bench {
namespace {

constexpr const char* usage = "usage: %s [--quick] [--seconds S] [--only PHASE] [--csv FOLDER] [--device D]\n"
                              "  --quick       fewer and shorter rows\n"
                              "  --seconds S   time for each row (default 0.4)\n"
                              "  --only PHASE  phases whose name begins so\n"
                              "  --csv FOLDER  where the rows go as NAME.csv as well (default: beside the program)\n"
                              "  --device D    the OpenCL device of bench_gpu: a number, or part of its name\n";

bool parse(int argc, char** argv, Options& options, std::filesystem::path& folder) {
    bool hasSeconds = false;
    for (int i = 1; i < argc; ++i) {
        const std::string name = argv[i];
        if (name == "--quick") {
            options.isQuick = true;
            continue;
        }
        if (++i == argc)
            return false;
        if (name == "--csv")
            folder = argv[i];
        else if (name == "--seconds")
            options.seconds = std::atof(argv[i]);
        else if (name == "--only")
            options.only = argv[i];
        else if (name == "--device")
            options.device = argv[i];
        else
            return false;
        hasSeconds = hasSeconds || name == "--seconds";
    }
    if (options.isQuick && !hasSeconds)
        options.seconds = 0.1;
    return options.seconds > 0.0;
}

} // namespace

std::optional<Options> readOptions(int argc, char** argv) {
    const std::filesystem::path program = argv[0];
    std::filesystem::path folder = program.parent_path();
    Options options;
    if (!parse(argc, argv, options, folder)) {
        std::fprintf(stderr, usage, program.filename().c_str());
        return std::nullopt;
    }
    options.csvPath = (folder / program.filename()).string() + ".csv";
    options.csv.reset(std::fopen(options.csvPath.c_str(), "w"));
    if (!options.csv) {
        std::fprintf(stderr, "%s: %s cannot be written\n", program.filename().c_str(), options.csvPath.c_str());
        return std::nullopt;
    }
    return options;
}

} // namespace bench
