// SPDX-License-Identifier: Apache-2.0
#include "host/faults/FaultRows.h"
#include "host/plugins/TinyTypes.h"

#include "openquarn/HFnPlugin.h"
#include "openquarn/gpu/HGPUDeformerRegistry.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"

#include <stdexcept>

namespace {

using Step = HStatus (*)(HFnPlugin& set);

Step runningStep;

HStatus runStep(HObject plugin) {
    HFnPlugin set(plugin, "Makers", "1.0");
    return runningStep(set);
}

HStatus leaveAll(HObject) {
    return HStatus::kSuccess;
}

// runs a step as the initializer of a plug-in; the session takes away what it registered
HStatus inPlugin(Step step) {
    const OpenQuarn::Session session;
    runningStep = step;
    try {
        OpenQuarn::addPlugin("stepper", runStep, leaveAll);
        return HStatus::kSuccess;
    } catch (const std::runtime_error& error) {
        return {HStatus::kFailure, error.what()};
    }
}

HStatus registerTexts() {
    return HStatus::kSuccess;
}

class NoDeformer : public HGPUDeformerRegistrationInfo {
public:
    HPxGPUDeformer* createGPUDeformer() override { return nullptr; }
};

HStatus registerGPU() {
    static NoDeformer info;
    return HGPUDeformerRegistry::registerGPUDeformerCreator("tinyNode", "Makers", &info);
}

FaultRow row(const char* operation, Step step) {
    return {operation, [step] { return inPlugin(step); }};
}

} // namespace

std::vector<FaultRow> pluginsRows() {
    return {
        row("HFnPlugin::registerNode",
            [](HFnPlugin& set) { return set.registerNode("tinyNode", tinyNodeId, createTinyNode, nullptr); }),
        row("HFnPlugin::deregisterNode",
            [](HFnPlugin& set) {
                set.registerNode("tinyNode", tinyNodeId, createTinyNode, nullptr);
                return set.deregisterNode(tinyNodeId);
            }),
        row("HFnPlugin::registerData",
            [](HFnPlugin& set) { return set.registerData("tinyData", tinyDataId, createTinyData); }),
        row("HFnPlugin::deregisterData",
            [](HFnPlugin& set) {
                set.registerData("tinyData", tinyDataId, createTinyData);
                return set.deregisterData(tinyDataId);
            }),
        row("HFnPlugin::registerCommand",
            [](HFnPlugin& set) { return set.registerCommand("tinyCommand", createTinyCommand); }),
        row("HFnPlugin::deregisterCommand",
            [](HFnPlugin& set) {
                set.registerCommand("tinyCommand", createTinyCommand);
                return set.deregisterCommand("tinyCommand");
            }),
        row("HFnPlugin::registerUIStrings",
            [](HFnPlugin& set) { return set.registerUIStrings(registerTexts, HString()); }),
        row("HGPUDeformerRegistry::registerGPUDeformerCreator", [](HFnPlugin&) { return registerGPU(); }),
        row("HGPUDeformerRegistry::deregisterGPUDeformerCreator",
            [](HFnPlugin&) {
                registerGPU();
                return HGPUDeformerRegistry::deregisterGPUDeformerCreator("tinyNode", "Makers");
            }),
    };
}
