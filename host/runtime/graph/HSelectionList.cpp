// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HSelectionList.h"

#include "core/apiCall.h"
#include "graph/plugImpl.h"
#include "graph/plugName.h"

#include <algorithm>
#include <stdexcept>

using OpenQuarn::Access;
using OpenQuarn::apiCall;
using OpenQuarn::Operation;

HStatus HSelectionList::addItem(Item item) {
    const bool present = std::any_of(items_.begin(), items_.end(), [&](const Item& other) {
        return other.node == item.node && other.plug == item.plug;
    });
    if (!present)
        items_.push_back(std::move(item));
    return HStatus::kSuccess;
}

HStatus HSelectionList::add(const HString& name) {
    return apiCall(Operation::HSelectionList_add, [&]() -> HStatus {
        const OpenQuarn::Graph& graph = OpenQuarn::currentGraph();
        const std::string& text = name.asStdString();
        try {
            if (text.find('.') != std::string::npos)
                return addItem({HObject(), plugNamed(graph, text)});
        } catch (const std::invalid_argument& error) {
            return {HStatus::kNotFound, error.what()};
        }
        if (const auto node = graph.find(text))
            return addItem({Access::object(node), HPlug()});
        const std::size_t before = items_.size();
        bool matched = false;
        if (text.find_first_of("*?") != std::string::npos)
            for (const auto& node : graph.nodes())
                if (OpenQuarn::matchesPattern(node->name(), text)) {
                    addItem({Access::object(node), HPlug()});
                    matched = true;
                }
        if (matched || items_.size() > before)
            return HStatus::kSuccess;
        return {HStatus::kNotFound, "there is no node named '" + text + "'"};
    });
}

HStatus HSelectionList::add(const HObject& node) {
    return apiCall(Operation::HSelectionList_add, [&]() -> HStatus {
        if (!node.hasFn(HFn::kDependencyNode))
            return {HStatus::kInvalidParameter, "the object is no node"};
        return addItem({node, HPlug()});
    });
}

HStatus HSelectionList::add(const HPlug& plug) {
    return apiCall(Operation::HSelectionList_add, [&]() -> HStatus {
        if (plug.isNull())
            return {HStatus::kInvalidParameter, "the plug is null"};
        return addItem({HObject(), plug});
    });
}

namespace {

HStatus noEntry(unsigned index, unsigned length) {
    return {HStatus::kFailure, "the selection has " + std::to_string(length) + " entries, and none with the number " +
                                   std::to_string(index)};
}

} // namespace

HStatus HSelectionList::getDependNode(unsigned index, HObject& node) const {
    return apiCall(Operation::HSelectionList_getDependNode, [&]() -> HStatus {
        if (index >= items_.size())
            return noEntry(index, length());
        const Item& item = items_[index];
        const HObject found = item.node.isNull() ? item.plug.node() : item.node;
        if (found.isNull())
            return {HStatus::kFailure, "the selected node has been deleted"};
        node = found;
        return HStatus::kSuccess;
    });
}

HStatus HSelectionList::getPlug(unsigned index, HPlug& plug) const {
    return apiCall(Operation::HSelectionList_getPlug, [&]() -> HStatus {
        if (index >= items_.size())
            return noEntry(index, length());
        if (items_[index].plug.isNull())
            return {HStatus::kFailure, "the selected entry is not a plug, or its node has been deleted"};
        plug = items_[index].plug;
        return HStatus::kSuccess;
    });
}
