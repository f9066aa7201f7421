// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Resources.h"

#include "openquarn/HGlobal.h"
#include "openquarn_app/Workspace.h"

#include <dlfcn.h>
#include <mutex>
#include <system_error>

namespace OpenQuarn {
namespace {

namespace fs = std::filesystem;

const char here = 0; // lies in the library itself, where the address of a function may be one of the program's

/// Folder of the library that this code is in; empty when it cannot be told.
fs::path libraryFolder() {
    Dl_info info{};
    if (dladdr(&here, &info) == 0 || !info.dli_fname)
        return {};
    std::error_code error;
    const fs::path absolute = fs::absolute(Workspace::callersPath(info.dli_fname), error);
    return error ? fs::path() : absolute.parent_path();
}

fs::path firstPath() {
    const fs::path folder = libraryFolder();
    std::error_code ignored; // a folder that cannot be looked at is not used
    if (fs::is_directory(folder / "resources", ignored))
        return folder / "resources";
    return folder.parent_path() / "share/OpenQuarn";
}

std::string withoutFinalSeparator(const fs::path& path) {
    return path.has_relative_path() && !path.has_filename() ? path.parent_path().string() : path.string();
}

struct Held {
    std::mutex mutex;
    std::string path = withoutFinalSeparator(firstPath());
};

Held& held() {
    static Held theHeld;
    return theHeld;
}

} // namespace

std::string Resources::path() {
    const std::scoped_lock lock(held().mutex);
    return held().path;
}

void Resources::setPath(const fs::path& path) {
    std::string text = withoutFinalSeparator(
        path.empty() ? firstPath() : fs::absolute(Workspace::callersPath(path)).lexically_normal());
    const std::scoped_lock lock(held().mutex);
    held().path = std::move(text);
}

} // namespace OpenQuarn

HString HGlobal::getAbsolutePathToResources() {
    return HString(OpenQuarn::Resources::path());
}
