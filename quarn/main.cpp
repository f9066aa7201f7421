// SPDX-License-Identifier: Apache-2.0
// quarn: the host without a screen.
#include "quarn/commands.h"

#include <CLI/CLI.hpp>

#include <exception>
#include <iostream>

namespace {

int run(int argc, char** argv) {
    CLI::App app("quarn: the host without a screen");
    app.set_version_flag("--version", "quarn " QUARN_VERSION);
    app.require_subcommand(1);

    std::vector<std::string> plugins;
    const auto takesPlugins = [&](CLI::App& command) {
        command.add_option("-p,--plugin", plugins, "Load a plug-in first; may be repeated")
            ->type_name("PATH")
            ->allow_extra_args(false);
    };
    std::string script;
    CLI::App* exec = app.add_subcommand("exec", "Run a script of commands");
    takesPlugins(*exec);
    exec->add_option("FILE", script, "The script; - for standard input")->required();

    std::string scene;
    bool json = false;
    CLI::App* info = app.add_subcommand("info", "Show what is in a scene file");
    info->add_option("SCENE", scene, "The scene file")->required();
    info->add_flag("--json", json, "Print JSON");

    std::string nodeType;
    CLI::App* listAttr = app.add_subcommand("listAttr", "List the attributes of a node type");
    takesPlugins(*listAttr);
    listAttr->add_option("TYPE", nodeType, "The node type")->required();
    listAttr->add_flag("--json", json, "Print JSON");

    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error); // help and version are no failures
    }
    if (exec->parsed())
        quarn::execute(plugins, script);
    if (info->parsed())
        quarn::showInfo(scene, json);
    if (listAttr->parsed())
        quarn::listAttributes(plugins, nodeType, json);
    if (!std::cout.flush())
        throw std::runtime_error("standard output could not be written");
    return 0;
}

} // namespace

int main(int argc, char** argv) {
    try {
        return run(argc, argv);
    } catch (const std::exception& error) {
        std::cerr << "quarn: " << error.what() << '\n';
        return 1;
    }
}
