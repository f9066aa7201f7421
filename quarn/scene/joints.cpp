// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/joints.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn/HPlug.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <map>
#include <stdexcept>

namespace quarn {
namespace {

// a joint and the name of what its parent matrix comes from
struct Found {
    SceneJoint joint;
    std::string parent; ///< name of the joint above; empty without one
};

std::string jointAbove(const HPlug& source) {
    const bool isWorld = !source.isNull() && nodeType(source.node()) == "joint" &&
                         std::string(HFnAttribute(source.attribute()).name().asChar()) == "worldMatrix";
    return isWorld ? nodeName(source.node()) : "";
}

Found found(const HObject& node) {
    Found result;
    result.joint.node = node;
    result.joint.name = nodeName(node);
    const HPlug matrix = plugOf(node, "parentMatrix");
    const HPlug source = matrix.source();
    result.parent = jointAbove(source);
    if (!result.parent.empty())
        return result;
    if (!source.isNull())
        result.joint.held = source.name().asChar();
    result.joint.space = matrixOf(matrix);
    return result;
}

// depth first is not needed: only that a parent has its index before its children
class Order {
public:
    explicit Order(std::vector<Found> joints)
        : found_(std::move(joints)) {}

    std::vector<SceneJoint> take() {
        while (!found_.empty()) {
            const std::size_t before = found_.size();
            takeReady();
            if (found_.size() == before)
                throw std::runtime_error("the joint " + found_.front().joint.name + " hangs below itself");
        }
        return std::move(ordered_);
    }

private:
    void takeReady() {
        std::vector<Found> later;
        for (Found& one : found_) {
            const auto parent = indexByName_.find(one.parent);
            if (!one.parent.empty() && parent == indexByName_.end()) {
                later.push_back(std::move(one));
                continue;
            }
            one.joint.parent = one.parent.empty() ? -1 : static_cast<int>(parent->second);
            indexByName_[one.joint.name] = ordered_.size();
            ordered_.push_back(std::move(one.joint));
        }
        found_ = std::move(later);
    }

    std::vector<Found> found_;
    std::vector<SceneJoint> ordered_;
    std::map<std::string, std::size_t> indexByName_;
};

} // namespace

std::vector<SceneJoint> sceneJoints() {
    std::vector<Found> joints;
    for (const HObject& node : nodesOfType("joint"))
        joints.push_back(found(node));
    return Order(std::move(joints)).take();
}

std::optional<std::size_t> indexOfJoint(const std::vector<SceneJoint>& joints, const HObject& node) {
    const auto place =
        std::find_if(joints.begin(), joints.end(), [&](const auto& joint) { return joint.node == node; });
    return place == joints.end() ? std::nullopt : std::optional(static_cast<std::size_t>(place - joints.begin()));
}

} // namespace quarn
