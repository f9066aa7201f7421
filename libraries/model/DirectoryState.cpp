// SPDX-License-Identifier: Apache-2.0
#include "nw_model/DirectoryState.h"

#include <chrono>
#include <thread>

#include <sys/stat.h>

namespace neuralWarp {
namespace {

using std::chrono::milliseconds;
using std::chrono::nanoseconds;
using std::chrono::seconds;

// a directory that has just been changed may still be changing (decision 0119)
constexpr milliseconds rest{20};
constexpr milliseconds longestWait{100};

} // namespace

DirectoryState::Entries DirectoryState::entriesOf(const std::filesystem::path& directory) {
    Entries entries;
    const char* const names[] = {"", "metadata.json", "model.onnx", "principal_shapes.json"};
    for (std::size_t i = 0; i < entries.size(); ++i) {
        struct stat found {};
        if (::stat((directory / names[i]).c_str(), &found) != 0)
            continue;
        entries[i].device = found.st_dev;
        entries[i].inode = found.st_ino;
        if (i == 0)
            continue; // its time changes with its name, and with files that are none of ours
        entries[i].size = static_cast<std::uint64_t>(found.st_size);
        entries[i].seconds = found.st_ctim.tv_sec; // unlike the time of the contents, nobody can set it back
        entries[i].nanoseconds = found.st_ctim.tv_nsec;
    }
    return entries;
}

bool DirectoryState::areAtRest(const Entries& entries) {
    const auto now = std::chrono::system_clock::now().time_since_epoch();
    for (const Entry& entry : entries) {
        const auto age = now - (seconds(entry.seconds) + nanoseconds(entry.nanoseconds));
        if (age < rest && age > -rest)
            return false;
    }
    return true;
}

DirectoryState DirectoryState::atRest(const std::filesystem::path& directory) noexcept {
    try {
        DirectoryState state;
        const auto end = std::chrono::steady_clock::now() + longestWait;
        for (;;) {
            state.entries_ = entriesOf(directory);
            state.isKnown_ = areAtRest(state.entries_);
            if (state.isKnown_ || std::chrono::steady_clock::now() > end)
                return state;
            std::this_thread::sleep_for(milliseconds(1));
        }
    } catch (...) {
        return {}; // no memory for a path
    }
}

bool DirectoryState::isStillThatOf(const std::filesystem::path& directory) const noexcept {
    try {
        return isKnown_ && entries_ == entriesOf(directory);
    } catch (...) {
        return false;
    }
}

} // namespace neuralWarp
