// SPDX-License-Identifier: Apache-2.0
// What the nodes need besides the scene file, asked for node by node.
#include "graph/Graph.h"
#include "openquarn/HExternalContentInfoTable.h"
#include "openquarn/HExternalContentLocationTable.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/SceneFile.h"

#include <unordered_map>
#include <unordered_set>

namespace OpenQuarn {
namespace {

/// Calls visit(node, its plug-in object) for every node of the scene; an exception of the plug-in is a message.
template <class Visit>
void forEachUserNode(const char* function, Visit&& visit) {
    const Graph* graph = Graph::current();
    if (!graph)
        return;
    for (const std::shared_ptr<Node>& node : graph->nodes())
        callPlugin(*node, function, [&]() -> HStatus {
            if (HPxNode* user = node->userNode())
                visit(*node, *user);
            return HStatus::kSuccess;
        });
}

HExternalContentInfoTable contentOf(const Node& node, const HPxNode& user) {
    HExternalContentInfoTable table;
    callPlugin(node, "getExternalContent", [&]() -> HStatus {
        user.getExternalContent(table);
        return HStatus::kSuccess;
    });
    return table;
}

void relocateNode(const Node& node, HPxNode& user, const std::vector<const Relocation*>& rows,
                  std::vector<std::string>& warnings) {
    const HExternalContentInfoTable content = contentOf(node, user);
    HExternalContentLocationTable table;
    for (const Relocation* row : rows) {
        HExternalContentInfo info;
        HStatus status = content.getInfo(row->key, info);
        if (!status.error())
            status = table.addEntry(row->key, row->location);
        if (status.error())
            warnings.push_back("node '" + node.name() + "': " + status.errorString().asStdString());
    }
    if (table.length() > 0)
        callPlugin(node, "setExternalContent", [&]() -> HStatus {
            user.setExternalContent(table);
            return HStatus::kSuccess;
        });
}

} // namespace

std::vector<std::string> filesToArchive(bool unresolved) {
    std::vector<std::string> files;
    std::unordered_set<std::string> seen;
    forEachUserNode("getFilesToArchive", [&](const Node&, const HPxNode& user) {
        for (const HString& file : user.getFilesToArchive(false, unresolved, false))
            if (!file.isEmpty() && seen.insert(file.asStdString()).second)
                files.push_back(file.asStdString());
    });
    return files;
}

std::vector<ExternalContent> externalContent() {
    std::vector<ExternalContent> all;
    forEachUserNode("getExternalContent", [&](const Node& node, const HPxNode& user) {
        const HExternalContentInfoTable table = contentOf(node, user);
        for (unsigned i = 0; i < table.length(); ++i) {
            HExternalContentInfo info;
            if (!table.getInfo(table.key(i), info).error())
                all.push_back({node.name(), info.key.asStdString(), info.unresolvedLocation.asStdString(),
                               info.resolvedLocation.asStdString(), info.role.asStdString(), info.isResolved});
        }
    });
    return all;
}

FileOutcome relocate(const std::vector<Relocation>& table) {
    FileOutcome outcome;
    const Graph* graph = Graph::current();
    if (!graph) {
        outcome.error = "there is no scene: no session has been started";
        return outcome;
    }
    outcome.ok = true;
    std::unordered_map<std::string, std::vector<const Relocation*>> byNode;
    for (const Relocation& row : table) {
        if (graph->find(row.node))
            byNode[row.node].push_back(&row);
        else
            outcome.warnings.push_back("there is no node named '" + row.node + "'");
    }
    forEachUserNode("setExternalContent", [&](const Node& node, HPxNode& user) {
        if (const auto rows = byNode.find(node.name()); rows != byNode.end())
            relocateNode(node, user, rows->second, outcome.warnings);
    });
    for (const std::string& warning : outcome.warnings)
        showMessage(Severity::warning, warning);
    return outcome;
}

} // namespace OpenQuarn
