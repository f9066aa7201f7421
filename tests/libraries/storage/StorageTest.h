// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "support/TemporaryFolder.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cerrno>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include <linux/capability.h>
#include <sys/syscall.h>
#include <unistd.h>

/// A folder to write into.
class StorageTest : public ::testing::Test {
protected:
    std::filesystem::path path(const std::filesystem::path& name) const { return folder.path() / name; }

    void put(const std::filesystem::path& name, const std::string& text) const {
        std::ofstream(path(name), std::ios::binary) << text;
    }
    std::string content(const std::filesystem::path& name) const {
        std::ifstream file(path(name), std::ios::binary);
        std::ostringstream text;
        text << file.rdbuf();
        return text.str();
    }
    /// Everything in the folder, sorted.
    std::vector<std::string> names() const {
        std::vector<std::string> all;
        for (const auto& entry : std::filesystem::directory_iterator(folder.path()))
            all.push_back(entry.path().filename());
        std::sort(all.begin(), all.end());
        return all;
    }

    TemporaryFolder folder;
};

/// What `work` throws.
inline std::string errorOf(const std::function<void()>& work) {
    try {
        work();
    } catch (const std::exception& error) {
        return error.what();
    }
    return "(nothing)";
}

/// Runs `work` on a thread for which permissions count, also when root runs the tests. Not run, and answers the errno,
/// where that could not be had.
inline int withoutPrivileges(const std::function<void()>& work) {
    int error = 0;
    std::thread([&] {
        __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
        __user_cap_data_struct none[2] = {};
        if (::syscall(SYS_capset, &header, none) == 0) // of this thread only
            work();
        else
            error = errno;
    }).join();
    return error;
}
