// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Workspace.h"

#include <filesystem>
#include <mutex>
#include <optional>
#include <system_error>
#include <utility>

namespace OpenQuarn {
namespace {

struct Root {
    std::mutex mutex;
    std::optional<std::string> directory;
};

Root& root() {
    static Root theRoot;
    return theRoot;
}

std::string currentDirectory() {
    std::error_code error;
    std::string directory = std::filesystem::current_path(error).string();
    if (!directory.empty() && directory.back() != '/')
        directory += '/';
    return directory;
}

} // namespace

std::string Workspace::rootDirectory() {
    const std::scoped_lock lock(root().mutex);
    return root().directory ? *root().directory : currentDirectory();
}

void Workspace::setRootDirectory(std::string newRoot) {
    const std::scoped_lock lock(root().mutex);
    root().directory = std::move(newRoot);
}

void Workspace::resetRootDirectory() noexcept {
    const std::scoped_lock lock(root().mutex);
    root().directory.reset();
}

} // namespace OpenQuarn
