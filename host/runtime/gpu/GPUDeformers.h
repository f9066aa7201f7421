// SPDX-License-Identifier: Apache-2.0
// The GPU deformers that plug-ins have registered for their node types.
#pragma once

#include <string>

class HGPUDeformerRegistrationInfo;

namespace OpenQuarn {

/// Thread: main. Throws std::invalid_argument when the type has one.
void addGPUDeformer(const std::string& nodeType, const std::string& registrant, HGPUDeformerRegistrationInfo* info);
/// Nothing happens when there is none.
void removeGPUDeformer(const std::string& nodeType);
/// Null when the type has none. `registrant` null, or receives who registered it.
HGPUDeformerRegistrationInfo* findGPUDeformer(const std::string& nodeType, std::string* registrant = nullptr);

} // namespace OpenQuarn
