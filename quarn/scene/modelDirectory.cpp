// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/modelDirectory.h"

#include "quarn/scene/Warp.h"
#include "quarn/scene/plugs.h"

namespace quarn {

std::filesystem::path modelDirectory(const Warp& warp, const WarpGeometry& geometry) {
    const std::filesystem::path root = textOf(warp.plug("modelRoot"));
    const std::filesystem::path name = textOf(warp.plug("models", geometry, "modelName"));
    return root.empty() || name.empty() ? std::filesystem::path() : (root / name).replace_extension(".nwrp");
}

bool isModelActive(const Warp& warp, const WarpGeometry& geometry) {
    return wholeNumberOf(warp.plug("models", geometry, "modelActive")) == 1;
}

} // namespace quarn
