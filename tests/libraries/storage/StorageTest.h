// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include <linux/capability.h>
#include <sys/resource.h>
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

/// Files of this process may have so many bytes while it lives; beyond that writing fails, as on a full disk.
class FileSizeLimit {
public:
    explicit FileSizeLimit(rlim_t bytes)
        : handler_(std::signal(SIGXFSZ, SIG_IGN)) {
        getrlimit(RLIMIT_FSIZE, &before_);
        const rlimit limit{bytes, before_.rlim_max};
        setrlimit(RLIMIT_FSIZE, &limit);
    }
    ~FileSizeLimit() {
        setrlimit(RLIMIT_FSIZE, &before_);
        std::signal(SIGXFSZ, handler_);
    }
    FileSizeLimit(const FileSizeLimit&) = delete;
    FileSizeLimit& operator=(const FileSizeLimit&) = delete;

private:
    rlimit before_ = {};
    void (*handler_)(int);
};

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
