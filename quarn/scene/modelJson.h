// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quarn/console/json.h"
#include "quarn/scene/useModel.h"

namespace quarn {

/// "model": {"name", "from"}, or null without one.
inline void writeModel(JsonWriter& json, const ModelInUse& model) {
    json.Key("model");
    if (model.name.empty())
        return static_cast<void>(json.Null());
    json.StartObject();
    writeText(json, "name", model.name);
    writeText(json, "from", model.from);
    json.EndObject();
}

} // namespace quarn
