// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HGPUDeformerRegistry.h"

#include "core/apiCall.h"
#include "gpu/GPUDeformers.h"
#include "plugins/PluginTable.h"

#include <stdexcept>

using OpenQuarn::apiCall;
using OpenQuarn::Operation;
using OpenQuarn::Plugin;
using OpenQuarn::Registration;

namespace {

Plugin& activePlugin() {
    Plugin* const plugin = OpenQuarn::PluginTable::instance().active();
    if (!plugin)
        throw std::runtime_error("GPU deformers are registered in a plug-in's entry points only");
    return *plugin;
}

} // namespace

HStatus HGPUDeformerRegistry::registerGPUDeformerCreator(const HString& nodeType, const HString& registrantId,
                                                         HGPUDeformerRegistrationInfo* info) {
    return apiCall(Operation::HGPUDeformerRegistry_registerGPUDeformerCreator, [&]() -> HStatus {
        if (nodeType.isEmpty() || registrantId.isEmpty() || !info)
            return {HStatus::kInvalidParameter, "a GPU deformer needs a node type, a registrant and an object: '" +
                                                    nodeType.asStdString() + "', '" + registrantId.asStdString() + "'"};
        activePlugin().registerGPUDeformer(nodeType.asStdString(), registrantId.asStdString(), info);
        return HStatus::kSuccess;
    });
}

HStatus HGPUDeformerRegistry::deregisterGPUDeformerCreator(const HString& nodeType, const HString& registrantId) {
    return apiCall(Operation::HGPUDeformerRegistry_deregisterGPUDeformerCreator, [&]() -> HStatus {
        std::string registrant;
        if (activePlugin().hasTakenBack(Registration::Kind::gpuDeformer, nodeType.asStdString()))
            return HStatus::kSuccess;
        OpenQuarn::findGPUDeformer(nodeType.asStdString(), &registrant);
        if (registrantId != HString(registrant))
            return {HStatus::kFailure, "'" + registrantId.asStdString() + "' has registered no GPU deformer of '" +
                                           nodeType.asStdString() + "'"};
        activePlugin().deregister(Registration::Kind::gpuDeformer, nodeType.asStdString());
        return HStatus::kSuccess;
    });
}
