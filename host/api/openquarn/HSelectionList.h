// SPDX-License-Identifier: Apache-2.0
// Nodes and plugs found by name.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HPlug.h"
#include "openquarn/HStatus.h"
#include "openquarn/HString.h"

#include <vector>

/// A list of nodes and plugs, in order of adding; what is in it already is not added again. [any], on a scene that
/// nobody changes meanwhile.
class OPENQUARN_API HSelectionList {
public:
    /// Adds the node "name" or the plug "name.attribute[index].child" (long or short names; an element need not exist).
    /// With "*" or "?" in a node's name, every node that matches, in order of creation. Fails with kNotFound, naming
    /// the text, when there is no such node or attribute; a pattern that matches nothing fails too.
    HStatus add(const HString& name);
    HStatus add(const HObject& node);
    HStatus add(const HPlug& plug);
    void clear() { items_.clear(); }
    unsigned length() const { return static_cast<unsigned>(items_.size()); }
    bool isEmpty() const { return items_.empty(); }

    /// The `index`-th entry's node; for a plug, the node it is on. Fails beyond the last, and for a deleted node.
    HStatus getDependNode(unsigned index, HObject& node) const;
    /// The `index`-th entry's plug. Fails beyond the last, and when the entry is a node.
    HStatus getPlug(unsigned index, HPlug& plug) const;

private:
    friend class HArgDatabase;
    struct Item {
        HObject node;
        HPlug plug;
    };
    HStatus addItem(Item item);
    std::vector<Item> items_;
};
