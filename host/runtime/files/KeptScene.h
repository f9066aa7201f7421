// SPDX-License-Identifier: Apache-2.0
// What a scene file says that cannot be made part of the scene: kept, to be written again.
#pragma once

#include "graph/Graph.h"

#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace OpenQuarn {

/// A key with a value as JSON.
using KeptMember = std::pair<std::string, std::string>;

/// An entry of the plug-in list that no node of the scene stands for.
struct KeptPlugin {
    std::string name; ///< empty for one that is no name
    std::string json;
};

/// Of the scene; what belongs to a node that exists is its Node::unknownFileContent.
class KeptScene final : public KeptFileContent {
public:
    /// A node of the file: one that exists, or one that could not be created, as JSON.
    struct FileNode {
        std::weak_ptr<Object> node;
        std::string json;
    };
    /// An end of a connection: "attribute[0]" on a node that exists (it may be renamed), or the whole name.
    struct End {
        std::weak_ptr<Object> node;
        bool isOnNode = false;
        std::string name;
    };
    struct Connection {
        End source, destination;
        std::string json; ///< instead of the ends, for one that was not understood
    };

    std::vector<KeptMember> members;
    std::vector<FileNode> nodes; ///< all of the file, in its order; empty when each of them exists
    std::vector<Connection> connections;
    std::vector<KeptPlugin> plugins;
};

/// What is kept of a node that exists.
struct KeptNode {
    std::vector<KeptMember> members;
    std::vector<KeptMember> values;  ///< by path: "attribute[0].child"
    std::vector<std::string> locked; ///< as JSON

    bool empty() const { return members.empty() && values.empty() && locked.empty(); }
    /// The form that Node::unknownFileContent holds.
    std::string toText() const;
    static KeptNode fromText(const std::string& text);
};

} // namespace OpenQuarn
