// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/useModel.h"

#include "quarn/scene/plugs.h"

namespace quarn {

void useModel(const Warp& warp, const WarpGeometry& geometry, const std::string& name) {
    setText(warp.plug("models", geometry, "modelName"), name);
    setNumber(warp.plug("models", geometry, "modelActive"), 1.0);
}

} // namespace quarn
