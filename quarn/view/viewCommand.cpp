// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/commands.h"

#include "quarn/console/Console.h"
#include "quarn/console/StdoutAside.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/consoleOptions.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/printable.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/view/viewReport.h"

#include <CLI/CLI.hpp>

#include <charconv>
#include <cmath>
#include <iostream>
#include <map>
#include <memory>
#include <stdexcept>

namespace quarn {
namespace {

struct Options {
    SceneOptions scene;
    Console console;
    ModelOption model;
    std::string deformer, geometry, frames, title;
    std::string basis = "auto", target, view = "25,10", up = "y";
    std::filesystem::path output;
    std::optional<double> limitMm;
    std::uint32_t textureSize = 1024;
    bool hasNoTextures = false;
};

// degrees around, and above
PageView viewOf(const Options& options) {
    constexpr double mostElevation = 90.0;
    PageView view;
    view.up = options.up;
    const char* const end = options.view.data() + options.view.size();
    const auto azimuth = std::from_chars(options.view.data(), end, view.azimuth);
    const bool hasSecond = azimuth.ec == std::errc() && azimuth.ptr != end && *azimuth.ptr == ',';
    const auto elevation = std::from_chars(hasSecond ? azimuth.ptr + 1 : end, end, view.elevation);
    const bool isNumber = hasSecond && elevation.ec == std::errc() && elevation.ptr == end;
    if (!isNumber || !(std::abs(view.elevation) <= mostElevation) || !(std::abs(view.azimuth) <= 1e6))
        throw UsageError(
            "\"" + options.view +
            "\" is no view: write AZIMUTH,ELEVATION in degrees, as in 25,10; the elevation from -90 to 90");
    return view;
}

BasisKind basisOf(const std::string& text) {
    return text == "f32" ? BasisKind::f32 : text == "i8" ? BasisKind::i8 : BasisKind::i16;
}

std::optional<TargetKind> targetOf(const std::string& text) {
    const std::map<std::string, TargetKind> kinds = {
        {"points", TargetKind::points}, {"errors", TargetKind::errors}, {"none", TargetKind::none}};
    const auto kind = kinds.find(text);
    return kind == kinds.end() ? std::nullopt : std::optional(kind->second);
}

void view(Options& options) {
    watchForInterrupt();
    const PageView first = viewOf(options);
    options.output = absolutePath(options.output);
    std::string answer;
    {
        const StdoutAside aside;
        SceneSession session(options.scene);
        const Warp warp = Warp::find(options.deformer);
        const WarpGeometry& geometry = warp.geometry(options.geometry);
        const ModelInUse model = chooseModel(warp, geometry, options.model);
        if (!model.note.empty())
            options.console.note(model.note);
        const ViewPlan plan{warp,
                            geometry,
                            framesToPlay(options.frames, &warp),
                            basisOf(options.basis),
                            targetOf(options.target),
                            options.hasNoTextures ? 0 : options.textureSize,
                            options.title.empty() ? options.output.stem().string() : options.title,
                            options.scene.scene.filename().string(),
                            first,
                            options.limitMm,
                            options.output};
        const ViewResult result = makePage(session, plan, options.console);
        answer = options.console.json ? viewJson(result, plan) : viewText(result, plan);
    }
    std::cout << printable(answer);
}

void addContentOptions(CLI::App& command, Options& options) {
    command.add_option("--frames", options.frames, "As 5, 1-100 or 1-100x5; the deformer's export range by default");
    command
        .add_option("--basis", options.basis,
                    "Numbers of the principal shapes: f32 as they are, i16 (auto) in half the size, i8 for a preview")
        ->check(CLI::IsMember({"auto", "f32", "i16", "i8"}))
        ->capture_default_str();
    command
        .add_option("--target", options.target,
                    "What is kept of the deformer's target: points (the default where there is one), only the errors "
                    "before and after, or none")
        ->check(CLI::IsMember({"points", "errors", "none"}));
    command.add_flag("--no-textures", options.hasNoTextures, "Leave the character's pictures out");
    command.add_option("--texture-size", options.textureSize, "Longest side of a picture in pixels")
        ->check(CLI::Range(16, 8192))
        ->capture_default_str();
    command.add_option("--title", options.title, "What the page is called; the name of FILE by default");
    command.add_option("--view", options.view, "Where the viewer stands at first, in degrees, as in quarn render")
        ->type_name("AZ,EL")
        ->capture_default_str();
    command.add_option("--up", options.up, "The axis of the scene that points up")
        ->check(CLI::IsMember({"x", "y", "z"}))
        ->capture_default_str();
    command
        .add_option("--limit", options.limitMm,
                    "Millimetres that the page may differ from quarn play, beside what packing the basis costs; 0.01 "
                    "by default, or 1e-5 of the mesh's diagonal where that is more")
        ->check(CLI::PositiveNumber)
        ->type_name("MM");
}

} // namespace

void addViewCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("view", "Write one HTML file that shows a deformed mesh in a browser");
    addSceneOptions(*command, options->scene);
    command->add_option("-o,--output", options->output, "The HTML file to write")->type_name("FILE")->required();
    command->add_option("--deformer", options->deformer, "The neuralWarp node, where there are several");
    command->add_option("--geometry", options->geometry, "Index or name of the mesh, where it deforms several");
    command
        ->add_option("--model", options->model.name, "Use the model NAME.nwrp of the deformer's modelRoot, switched on")
        ->type_name("NAME");
    addContentOptions(*command, *options);
    addConsoleOptions(*command, options->console, true);
    addProgressOption(*command, options->console);
    command->callback([options] { view(*options); });
}

} // namespace quarn
