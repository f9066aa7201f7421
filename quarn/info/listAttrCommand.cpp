// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Session.h"
#include "quarn/console/Log.h"
#include "quarn/info/attributeTexts.h"
#include "quarn/info/commands.h"
#include "quarn/scene/SceneSession.h"

#include <CLI/CLI.hpp>

#include <iostream>

namespace quarn {
namespace {

struct Options {
    std::vector<std::string> plugins;
    std::string nodeType;
    bool json = false;
};

void listAttributes(const Options& options) {
    const OpenQuarn::Session session;
    loadPlugins(options.plugins, false);
    const AttributeList list{OpenQuarn::attributesOf(options.nodeType), OpenQuarn::dependenciesOf(options.nodeType)};
    log([&] { return options.nodeType + " has " + std::to_string(list.attributes.size()) + " attributes"; });
    std::cout << (options.json ? attributeJson(list) + "\n" : attributeLines(list));
}

} // namespace

void addListAttrCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* listAttr = app.add_subcommand("listAttr", "List the attributes of a node type");
    listAttr->add_option("-p,--plugin", options->plugins, "Load a plug-in first; may be repeated")
        ->type_name("PATH")
        ->allow_extra_args(false);
    listAttr->add_option("TYPE", options->nodeType, "The node type")->required();
    listAttr->add_flag("--json", options->json, "Print JSON");
    listAttr->callback([options] { listAttributes(*options); });
}

} // namespace quarn
