// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Workspace.h"

#include <mutex>
#include <optional>
#include <system_error>
#include <utility>

namespace OpenQuarn {
namespace {

namespace fs = std::filesystem;

struct Folders {
    std::mutex mutex;
    std::optional<std::string> root;
    fs::path callers; // empty until it is set
};

Folders& folders() {
    static Folders theFolders;
    return theFolders;
}

fs::path setCallers() {
    const std::scoped_lock lock(folders().mutex);
    return folders().callers;
}

std::string withFinalSeparator(std::string directory) {
    if (!directory.empty() && directory.back() != '/')
        directory += '/';
    return directory;
}

} // namespace

fs::path Workspace::callersFolder() {
    const fs::path set = setCallers();
    std::error_code none;
    return set.empty() ? fs::current_path(none) : set;
}

void Workspace::setCallersFolder(fs::path folder) {
    const std::scoped_lock lock(folders().mutex);
    folders().callers = std::move(folder);
}

fs::path Workspace::callersPath(const fs::path& path) {
    const fs::path set = setCallers();
    return set.empty() || path.empty() || path.is_absolute() ? path : set / path;
}

std::string Workspace::rootDirectory() {
    {
        const std::scoped_lock lock(folders().mutex);
        if (folders().root)
            return *folders().root;
    }
    return withFinalSeparator(callersFolder().string());
}

void Workspace::setRootDirectory(std::string newRoot) {
    const std::scoped_lock lock(folders().mutex);
    folders().root = std::move(newRoot);
}

void Workspace::resetRootDirectory() noexcept {
    const std::scoped_lock lock(folders().mutex);
    folders().root.reset();
}

} // namespace OpenQuarn
