// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/modelDirectory.h"

#include "quarn/scene/Warp.h"
#include "quarn/scene/plugs.h"

#include <stdexcept>
#include <string>
#include <system_error>

namespace quarn {

namespace fs = std::filesystem;

std::filesystem::path modelDirectory(const Warp& warp, const WarpGeometry& geometry) {
    const std::filesystem::path root = textOf(warp.plug("modelRoot"));
    const std::filesystem::path name = textOf(warp.plug("models", geometry, "modelName"));
    return root.empty() || name.empty() ? std::filesystem::path() : (root / name).replace_extension(".nwrp");
}

void requireModelDirectory(const Warp& warp, const WarpGeometry& geometry) {
    const fs::path directory = fs::absolute(modelDirectory(warp, geometry)).lexically_normal();
    std::error_code error;
    if (fs::is_directory(directory, error))
        return;
    std::string names;
    for (fs::directory_iterator entry(directory.parent_path(), error), end; !error && entry != end;
         entry.increment(error))
        if (entry->path().extension() == ".nwrp")
            names += (names.empty() ? "" : ", ") + entry->path().stem().string();
    throw std::runtime_error("there is no model " + directory.string() + ", which is " + warp.name +
                             ".modelRoot, the name and .nwrp; " +
                             (names.empty() ? "no model is there" : "there is " + names));
}

bool isModelActive(const Warp& warp, const WarpGeometry& geometry) {
    return wholeNumberOf(warp.plug("models", geometry, "modelActive")) == 1;
}

} // namespace quarn
