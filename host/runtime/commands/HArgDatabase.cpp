// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HArgDatabase.h"

#include "commands/ParsedArgs.h"
#include "core/Object.h"
#include "core/apiCall.h"
#include "graph/plugName.h"
#include "openquarn/HSelectionList.h"

using OpenQuarn::Access;
using OpenQuarn::Operation;

HArgDatabase::HArgDatabase(const HSyntax& syntax, const HArgList& args, HStatus* status)
    : HArgParser(OpenQuarn::apiValue(Operation::HArgDatabase_HArgDatabase, status,
                                     std::shared_ptr<const OpenQuarn::ParsedArgs>(),
                                     [&](HStatus& outcome) { return OpenQuarn::parseArgs(syntax, args, outcome); })) {}

HStatus HArgDatabase::getCommandArgument(unsigned index, HSelectionList& result) const {
    return OpenQuarn::apiCall(Operation::HArgDatabase_getCommandArgument, [&]() -> HStatus {
        const auto& parsed = Access::impl(static_cast<const HArgParser&>(*this));
        if (!parsed || index >= parsed->args.length())
            return {HStatus::kFailure, "there is no argument " + std::to_string(index)};
        const std::string& name = Access::impl(parsed->args)[index].text.asStdString();
        const OpenQuarn::Graph& graph = OpenQuarn::currentGraph();
        HSelectionList::Item item;
        if (name.find('.') != std::string::npos)
            item.plug = OpenQuarn::plugNamed(graph, name);
        else if (const auto node = graph.find(name))
            item.node = Access::object(node);
        else
            return {HStatus::kFailure, "there is no node named '" + name + "'"};
        result.items_.assign(1, item);
        return {};
    });
}
