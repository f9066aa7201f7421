// SPDX-License-Identifier: Apache-2.0
#include "types/baseNodes.h"

#include "core/apiCall.h"
#include "core/text.h"
#include "openquarn_app/Messages.h"

#include <array>
#include <stdexcept>

namespace OpenQuarn {
namespace {

std::shared_ptr<Attribute> outTimeAttribute() {
    static const std::shared_ptr<Attribute> attribute = [] {
        std::shared_ptr<Attribute> made = makeAttribute(HFn::kNumericAttribute, "outTime", "o");
        made->number = HFnNumericData::kDouble;
        made->defaultNumber = 1.0;
        made->writable = false;
        made->storable = false;
        return made;
    }();
    return attribute;
}

HPxNode* createPlainNode() {
    return new HPxNode;
}

std::array<std::shared_ptr<const NodeClass>, 3>& bases() {
    static std::array<std::shared_ptr<const NodeClass>, 3> classes;
    return classes;
}

} // namespace

std::shared_ptr<Attribute> messageAttribute() {
    static const std::shared_ptr<Attribute> attribute = [] {
        std::shared_ptr<Attribute> made = makeAttribute(HFn::kMessageAttribute, "message", "msg");
        made->writable = false;
        made->storable = false;
        return made;
    }();
    return attribute;
}

std::shared_ptr<const NodeClass> dependClass() {
    static const std::shared_ptr<const NodeClass> type = [] {
        auto made = std::make_shared<NodeClass>("dependNode", HTypeId(0x4f510001), HFn::kDependencyNode, nullptr);
        made->add(messageAttribute());
        made->finish();
        return made;
    }();
    return type;
}

std::shared_ptr<const NodeClass> timeClass() {
    static const std::shared_ptr<const NodeClass> type = [] {
        auto made = std::make_shared<NodeClass>("time", HTypeId(0x4f510002), HFn::kTimeNode, createPlainNode);
        made->inherit(*dependClass());
        made->add(outTimeAttribute());
        made->finish();
        return made;
    }();
    return type;
}

unsigned timeOutPosition() {
    return timeClass()->find("outTime")->position;
}

void registerBaseNodes() {
    static const bool once = [] {
        addNodeClass(dependClass());
        addNodeClass(timeClass());
        setBaseClass(HPxNode::kDependNode, dependClass());
        return true;
    }();
    static_cast<void>(once);
}

void setBaseClass(HPxNode::Type type, std::shared_ptr<const NodeClass> base) {
    bases().at(static_cast<std::size_t>(type)) = std::move(base);
}

bool hasBaseClass(HPxNode::Type type) {
    const auto number = static_cast<std::size_t>(type);
    return number < bases().size() && bases()[number];
}

std::shared_ptr<const NodeClass> baseClassOf(HPxNode::Type type) {
    if (!hasBaseClass(type))
        throw std::invalid_argument("there is no kind of node types with the number " + std::to_string(type));
    return bases()[static_cast<std::size_t>(type)];
}

HFn::Type objectKindOf(HPxNode::Type type) {
    return type == HPxNode::kDependNode ? HFn::kPluginNode : HFn::kGeometryFilter;
}

std::shared_ptr<NodeClass> buildNodeClass(const std::string& name, HTypeId id, HPxNode::Type type,
                                          NodeClass::Creator creator, HStatus (*initializer)()) {
    if (!isIdentifier(name) || id.id() == 0 || !creator)
        throw std::invalid_argument("a node type needs a name, an id other than 0 and a creator: '" + name + "', " +
                                    hexText(id));
    auto built = std::make_shared<NodeClass>(name, id, objectKindOf(type), creator);
    built->inherit(*baseClassOf(type));
    if (initializer) {
        const ClassUnderConstruction construction(*built);
        HStatus status;
        try {
            status = initializer();
        } catch (...) {
            status = statusOfException("the initializer");
        }
        if (status.error())
            throw std::runtime_error("the initializer of node type '" + name +
                                     "' failed: " + status.errorString().asStdString());
    }
    built->finish();
    for (const std::string& doubt : built->doubtfulDeclarations())
        showMessage(Severity::warning, doubt);
    return built;
}

} // namespace OpenQuarn
