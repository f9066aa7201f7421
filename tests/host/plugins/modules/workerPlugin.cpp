// SPDX-License-Identifier: Apache-2.0
// A plug-in whose node works on several threads.
#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnPlugin.h"

#include <tbb/parallel_for.h>

#include <atomic>

extern "C" OPENQUARN_API const char HApiVersion[8];
const char HApiVersion[8] = OPENQUARN_API_VERSION;

namespace {

constexpr HTypeId nodeId{0x7031};

HObject count;
HObject total;

/// "total" = 0 + 1 + ... + ("count" - 1)
class Worker : public HPxNode {
public:
    HStatus compute(const HPlug& plug, HDataBlock& block) override {
        if (plug.attribute() != total)
            return HStatus::kUnknownParameter;
        const int n = block.inputValue(count).asInt();
        std::atomic<int> sum{0};
        tbb::parallel_for(0, n, [&](int i) { sum += i; });
        HDataHandle output = block.outputValue(total);
        output.set(sum.load());
        output.setClean();
        return HStatus::kSuccess;
    }
};

HPxNode* create() {
    return new Worker;
}

HStatus initialize() {
    count = HFnNumericAttribute().create("count", "c", HFnNumericData::kInt);
    HFnNumericAttribute output;
    total = output.create("total", "t", HFnNumericData::kInt);
    output.setWritable(false);
    for (const HObject& attribute : {count, total})
        if (HStatus status = HPxNode::addAttribute(attribute); status.error())
            return status;
    return HPxNode::attributeAffects(count, total);
}

} // namespace

extern "C" OPENQUARN_API HStatus initializePlugin(HObject plugin);
HStatus initializePlugin(HObject plugin) {
    return HFnPlugin(plugin, "Tiny Makers", "1.0").registerNode("tinyWorker", nodeId, create, initialize);
}

extern "C" OPENQUARN_API HStatus uninitializePlugin(HObject plugin);
HStatus uninitializePlugin(HObject plugin) {
    return HFnPlugin(plugin).deregisterNode(nodeId);
}
