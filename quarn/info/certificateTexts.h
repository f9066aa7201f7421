// SPDX-License-Identifier: Apache-2.0
// The certificate of a model, as people and programs read it.
#pragma once

#include "quarn/console/json.h"
#include "quarn/scene/modelFiles.h"

#include <string>

namespace quarn {

/// Sentences, as one would read them aloud; without a certificate why there is none.
std::string certificateText(const ModelKnowledge& knowledge);

/// "certificate": an object, or null; and "certificateNote", which says why there is none, or what it lacks.
void writeCertificate(JsonWriter& json, const ModelKnowledge& knowledge);

} // namespace quarn
