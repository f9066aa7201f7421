// SPDX-License-Identifier: Apache-2.0
#include "gpu/GPUDeformers.h"

#include "gpu/pipeline.h"

#include <map>
#include <stdexcept>

namespace OpenQuarn {
namespace {

struct Entry {
    std::string registrant;
    HGPUDeformerRegistrationInfo* info;
};

std::map<std::string, Entry>& entries() {
    static std::map<std::string, Entry> byType;
    return byType;
}

} // namespace

void addGPUDeformer(const std::string& nodeType, const std::string& registrant, HGPUDeformerRegistrationInfo* info) {
    const auto [place, isNew] = entries().try_emplace(nodeType, Entry{registrant, info});
    if (!isNew)
        throw std::invalid_argument("node type '" + nodeType + "' has a GPU deformer already, registered by '" +
                                    place->second.registrant + "'");
}

void removeGPUDeformer(const std::string& nodeType) {
    takeFromDevice(nodeType);
    entries().erase(nodeType);
}

HGPUDeformerRegistrationInfo* findGPUDeformer(const std::string& nodeType, std::string* registrant) {
    const auto found = entries().find(nodeType);
    if (found == entries().end())
        return nullptr;
    if (registrant)
        *registrant = found->second.registrant;
    return found->second.info;
}

} // namespace OpenQuarn
