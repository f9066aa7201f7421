// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/Report.h"

#include <algorithm>
#include <fstream>

namespace quarn {

bool Report::hasLimits() const {
    return std::any_of(rows.begin(), rows.end(), [](const Row& row) { return !row.judged.empty(); });
}

bool Report::isKept() const {
    return std::all_of(rows.begin(), rows.end(), [](const Row& row) { return row.isKept(); });
}

std::string processorName() {
    std::ifstream file("/proc/cpuinfo");
    for (std::string line; std::getline(file, line);)
        for (const std::string key : {"model name", "Model"}) // the second one of ARM
            if (const std::size_t colon = line.find(": "); line.rfind(key, 0) == 0 && colon != std::string::npos)
                return line.substr(colon + 2);
    return "unknown";
}

std::string gpuText(const Report& report) {
    for (const Row& row : report.rows)
        if (const auto& gpu = row.measured.gpu; gpu && gpu->deformations > 0)
            return "GPU: " + gpu->device;
    return "GPU: there was none to be used";
}

} // namespace quarn
