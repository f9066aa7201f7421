// SPDX-License-Identifier: Apache-2.0
#include "sceneTarget.h"

#include "host/files/fileNodes.h"
#include "require.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HSelectionList.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/SceneFile.h"
#include "openquarn_app/Session.h"

#include <algorithm>
#include <string>
#include <vector>

namespace {

std::string written() {
    std::string text;
    require(OpenQuarn::sceneToText(text).ok);
    return text;
}

/// Drops what is shown while it lives.
class Silence {
public:
    Silence()
        : previous_(OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {})) {}
    ~Silence() { OpenQuarn::setMessageSink(previous_); }
    Silence(const Silence&) = delete;
    Silence& operator=(const Silence&) = delete;

private:
    OpenQuarn::MessageSink previous_;
};

void evaluateOutput(const HPlug& output) {
    constexpr std::size_t most = 8; // elements of one array
    std::vector<unsigned> indices;
    if (output.getExistingArrayAttributeIndices(indices).error())
        OpenQuarn::evaluate(output);
    else if (indices.empty())
        indices.push_back(0); // of an output array, elements need not be there before somebody asks
    for (std::size_t i = 0; i < std::min(indices.size(), most); ++i)
        OpenQuarn::evaluate(output.elementByLogicalIndex(indices[i]));
}

void evaluateOutputs() {
    HSelectionList nodes;
    nodes.add("*");
    for (unsigned i = 0; i < nodes.length(); ++i) {
        HObject node;
        require(!nodes.getDependNode(i, node).error());
        const HFnDependencyNode list(node);
        for (unsigned at = 0; at < list.attributeCount(); ++at)
            if (const HFnAttribute attribute(list.attribute(at)); attribute.isReadable() && !attribute.isWritable())
                evaluateOutput(HPlug(node, list.attribute(at)));
    }
}

} // namespace

bool fuzzScene(const std::uint8_t* data, std::size_t size) {
    return fuzzSceneWith(data, size, [] {});
}

bool fuzzSceneWith(const std::uint8_t* data, std::size_t size, void (*registerTypes)()) {
    const Silence silence;
    const OpenQuarn::Session session;
    fileNodes::registerTypes();
    registerTypes();
    fileNodes::create("present");
    const std::string before = written();
    const std::string text(reinterpret_cast<const char*>(data), size);
    if (!OpenQuarn::sceneFromText(text, "fuzz").ok) {
        require(written() == before);
        return false;
    }
    const std::string once = written();
    require(OpenQuarn::sceneFromText(once, "fuzz").ok);
    require(written() == once);
    evaluateOutputs();
    written();
    return true;
}
