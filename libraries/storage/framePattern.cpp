// SPDX-License-Identifier: Apache-2.0
#include "storage/framePattern.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <system_error>

namespace storage {
namespace {

namespace fs = std::filesystem;

/// Where in a name the number goes; without a length in one that has no place for it.
struct Run {
    std::size_t first = 0, length = 0;
};

Run lastRun(const std::string& name) {
    const std::size_t last = name.rfind('#');
    if (last == std::string::npos)
        return {};
    const std::size_t first = name.find_last_not_of('#', last) + 1; // npos + 1 is 0
    return {first, last + 1 - first};
}

} // namespace

bool isFramePattern(const fs::path& path) {
    return path.filename().string().find('#') != std::string::npos;
}

fs::path frameFile(const fs::path& pattern, int frame) {
    std::string name = pattern.filename().string();
    const Run run = lastRun(name);
    if (run.length == 0)
        return pattern;
    std::string digits = std::to_string(std::abs(std::int64_t{frame}));
    digits.insert(0, run.length - std::min(run.length, digits.size()), '0');
    return pattern.parent_path() / name.replace(run.first, run.length, (frame < 0 ? "-" : "") + digits);
}

std::vector<int> framesOf(const fs::path& pattern) {
    const Run run = lastRun(pattern.filename().string());
    const fs::path folder = pattern.has_parent_path() ? pattern.parent_path() : ".";
    std::vector<int> frames;
    std::error_code error;
    for (const fs::directory_entry& entry : fs::directory_iterator(folder, error)) {
        const std::string name = entry.path().filename().string();
        int frame = 0;
        if (name.size() > run.first)
            std::from_chars(name.data() + run.first, name.data() + name.size(), frame);
        if (frameFile(pattern, frame).filename() == name)
            frames.push_back(frame);
    }
    std::sort(frames.begin(), frames.end());
    return frames;
}

} // namespace storage
