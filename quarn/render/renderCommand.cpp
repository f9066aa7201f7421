// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/commands.h"

#include "quarn/console/Console.h"
#include "quarn/console/Log.h"
#include "quarn/console/StdoutAside.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/consoleOptions.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/json.h"
#include "quarn/console/numberText.h"
#include "quarn/render/Subject.h"
#include "quarn/render/drawJoints.h"
#include "quarn/render/drawPanel.h"
#include "quarn/render/heat.h"
#include "quarn/render/pictureNames.h"
#include "quarn/scene/AppliedModels.h"
#include "quarn/scene/EnvelopeGuard.h"
#include "quarn/scene/FrameLog.h"
#include "quarn/scene/HostErrors.h"
#include "quarn/scene/PartFrames.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/frames.h"
#include "quarn/scene/modelJson.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/poseTexts.h"
#include "quarn/scene/shownMeshes.h"
#include "quarn/scene/units.h"
#include "quarn/scene/useModel.h"
#include "storage/WholeFile.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <iostream>
#include <set>
#include <stdexcept>

namespace quarn {
namespace {

constexpr std::size_t mostFramesLookedAt = 200; // before the first picture, for the camera and the range of colours
constexpr int smallestSide = 16;
constexpr int largestSide = 16384;

struct PanelText {
    std::string text;
    bool isHeat = false;
};

struct Options {
    SceneOptions scene;
    Console console;
    std::string output;
    std::string frames;
    PartOptions part;
    bool skipsExisting = false;
    std::string plug;
    std::string deformer;
    std::string geometry;
    ModelOption model;
    GuardOption guard;
    std::vector<PanelText> panels;
    double range = 0.0; // millimetres; 0 for the largest distance
    std::string size = "480x480";
    std::string view = "25,10";
    std::string up = "y";
    std::string frameOn = "all";
    bool hasJoints = false;
};

// what all pictures have in common
struct Shot {
    std::vector<Panel> panels;
    std::vector<std::vector<ModelInUse>> models; // of each panel's meshes
    PartFrames part;                             // the camera and the colours are those of the whole
    FrameRange frames;                           // of the part
    Layout layout;
    Camera camera;
    HeatScale scale;
    std::optional<EnvelopeGuard> guard;

    void setTime(SceneSession& session, int frame) {
        session.host().setTime(frame);
        if (guard)
            guard->apply(frame);
    }
};

// over all vertices and pictures of a panel, in object space
struct Measure {
    double sum = 0.0;
    double largest = 0.0;
    std::size_t count = 0;

    void add(const std::vector<double>& distances) {
        for (const double distance : distances) {
            sum += distance;
            largest = std::max(largest, distance);
        }
        count += distances.size();
    }
    double mean() const { return count > 0 ? sum / static_cast<double>(count) : 0.0; }
};

struct Answer {
    std::vector<std::filesystem::path> pictures;
    std::size_t skipped = 0;       // frames whose picture was there
    std::vector<Measure> measures; // of each panel
    std::vector<PoseReport> poses;
};

void setSize(Layout& layout, const std::string& text, std::size_t panels) {
    const char* const end = text.data() + text.size();
    const auto width = std::from_chars(text.data(), end, layout.width);
    const bool hasHeight = width.ec == std::errc() && width.ptr != end && *width.ptr == 'x';
    const auto height = std::from_chars(hasHeight ? width.ptr + 1 : end, end, layout.height);
    if (!hasHeight || height.ec != std::errc() || height.ptr != end)
        throw UsageError("\"" + text + "\" is no size of a panel: write WIDTHxHEIGHT, as in 480x480");
    const auto [smaller, larger] = std::minmax(layout.width, layout.height);
    if (smaller < smallestSide || larger > largestSide ||
        static_cast<std::size_t>(layout.width) * panels > static_cast<std::size_t>(largestSide))
        throw UsageError("a picture of " + std::to_string(panels) + " panel(s) of " + text +
                         " pixels cannot be made: a panel's sides are at least " + std::to_string(smallestSide) +
                         ", the picture's at most " + std::to_string(largestSide));
}

// one geometry of a deformer, where one is chosen; else the whole character
Panel defaultPanel(const Options& options) {
    Panel panel;
    if (options.deformer.empty() && options.geometry.empty() && !options.model.isGiven())
        for (const HPlug& mesh : shownMeshes())
            panel.meshes.push_back({mesh, HPlug()});
    if (panel.meshes.empty()) // caches without a mesh, say
        panel.meshes.push_back({Warp::find(options.deformer).geometry(options.geometry).output, HPlug()});
    return panel;
}

std::vector<Panel> panelsOf(const Options& options) {
    std::vector<Panel> panels;
    for (const PanelText& panel : options.panels)
        panels.push_back(panel.isHeat ? heatPanelFrom(panel.text) : panelFrom(panel.text));
    if (!options.plug.empty())
        panels.insert(panels.begin(), panelFrom("=" + options.plug));
    if (panels.empty())
        panels.push_back(defaultPanel(options));
    return panels;
}

void chooseModels(Shot& shot, const Options& options) {
    HPlug meant;
    ModelInUse given;
    if (options.model.isGiven()) {
        const Warp warp = Warp::find(options.deformer);
        const WarpGeometry& geometry = warp.geometry(options.geometry);
        meant = geometry.output;
        given = chooseModel(warp, geometry, options.model);
    }
    const auto modelOf = [&](const HPlug& mesh) { return mesh == meant ? given : chooseModel(mesh, {}); };
    for (const Panel& panel : shot.panels) {
        std::vector<ModelInUse>& models = shot.models.emplace_back();
        for (const PanelMesh& mesh : panel.meshes) {
            if (!mesh.reference.isNull())
                modelOf(mesh.reference);
            models.push_back(modelOf(mesh.mesh));
        }
    }
}

FrameRange framesOf(const Options& options, SceneSession& session) {
    if (!options.frames.empty())
        return frameRange(options.frames);
    const int now = static_cast<int>(std::lround(std::clamp(session.host().time(), -1e8, 1e8)));
    return {now, now, 1};
}

bool hasHeat(const std::vector<Panel>& panels) {
    return std::any_of(panels.begin(), panels.end(), [](const Panel& panel) { return panel.isHeat(); });
}

Shot plan(const Options& options, SceneSession& session) {
    Shot shot;
    shot.part = partFrames(framesOf(options, session), options.part);
    shot.frames = shot.part.frames;
    shot.panels = panelsOf(options);
    chooseModels(shot, options);
    shot.layout.hasLabels =
        std::any_of(shot.panels.begin(), shot.panels.end(), [](const Panel& panel) { return !panel.label.empty(); });
    shot.layout.hasColourBar = hasHeat(shot.panels);
    shot.layout.isCloseUp = frameOnFrom(options.frameOn) != FrameOn::all;
    setSize(shot.layout, options.size, shot.panels.size());
    return shot;
}

void throwIfAny(const HostErrors& errors, int frame) {
    if (const std::string text = errors.text(); !text.empty())
        throw std::runtime_error(text + " (at frame " + std::to_string(frame) + ")");
}

double largestOf(const std::vector<double>& distances) {
    return distances.empty() ? 0.0 : *std::max_element(distances.begin(), distances.end());
}

AppliedModels modelsOf(const Shot& shot) {
    std::vector<HPlug> meshes;
    for (const Panel& panel : shot.panels)
        for (const PanelMesh& mesh : panel.meshes)
            meshes.insert(meshes.end(), {mesh.mesh, mesh.reference});
    AppliedModels models(meshes);
    if (shot.guard)
        models.setGuarded();
    return models;
}

// looks at the frames before any is drawn: where the camera has to stand, and how far the colours have to reach
void look(Shot& shot, const View& view, const Options& options, SceneSession& session) {
    Subject subject(frameOnFrom(options.frameOn),
                    Framing(view, shot.layout.width, shot.layout.height, shot.layout.margins()));
    double largest = 0.0;
    const FrameRange& frames = shot.part.whole;
    const std::size_t count = frames.count();
    const std::size_t looks = std::min(count, mostFramesLookedAt);
    const Stage stage([] { return std::string("looking at the frames"); });
    const HostErrors errors;
    AppliedModels models = modelsOf(shot);
    Progress progress(options.console, "looking at the frames", looks);
    for (std::size_t number = 0; number < looks; ++number) {
        // with more frames than looks, spread evenly from the first to the last
        const int frame = frames.frame(looks == count ? number : number * (count - 1) / (looks - 1));
        const FrameLog log(frame);
        shot.setTime(session, frame);
        models.blame([&] {
            std::vector<PanelFrame> shown;
            for (const Panel& panel : shot.panels)
                shown.push_back(evaluatePanel(panel, frame));
            subject.include(shown);
            for (const PanelFrame& panel : shown)
                for (const MeshFrame& mesh : panel)
                    largest = std::max(largest, largestOf(mesh.distances));
            throwIfAny(errors, frame);
        });
        models.requireSound();
        if (shot.guard)
            shot.guard->forget(frame);
        progress.advance();
    }
    shot.camera = subject.camera();
    if (!subject.isFound())
        options.console.note(
            options.frameOn == "moving"
                ? "nothing moves from frame to frame: the camera is on all there is"
                : "no panel differs from another, nor a mesh from its reference: the camera is on all there is");
    const double millimetresPerUnit = 1000.0 * metersPerUnit();
    shot.scale.millimetres = options.range > 0.0 ? options.range : roundedUp(largest * millimetresPerUnit);
    shot.scale.range = shot.scale.millimetres / millimetresPerUnit;
}

void warnOfEmptyPanels(const Shot& shot, const Console& console) {
    for (const Panel& panel : shot.panels)
        for (const PanelMesh& mesh : panel.meshes)
            if (polygonsOf(mesh.mesh).sizes.empty())
                console.warn(std::string(mesh.mesh.name().asChar()) +
                             " has no polygons: there is nothing to see of it");
}

bool isThere(const std::filesystem::path& picture, const Options& options) {
    std::error_code none;
    return options.skipsExisting && std::filesystem::is_regular_file(picture, none);
}

bool areAllThere(const Shot& shot, const Options& options) {
    const std::filesystem::path pattern = absolutePath(options.output);
    for (std::size_t number = 0; number < shot.frames.count(); ++number)
        if (!isThere(pictureName(pattern, shot.frames.frame(number), shot.frames.count() > 1), options))
            return false;
    return true;
}

// for what remembers the frames before the one that is drawn
void evaluateBefore(Shot& shot, SceneSession& session, const HostErrors& errors, int frame) {
    throwIfInterrupted();
    shot.setTime(session, frame);
    for (const Panel& panel : shot.panels)
        evaluatePanel(panel, frame);
    throwIfAny(errors, frame);
    if (shot.guard)
        shot.guard->forget(frame);
}

void drawPictures(Shot& shot, const Options& options, SceneSession& session, Answer& answer) {
    const std::filesystem::path pattern = absolutePath(options.output);
    const std::size_t count = shot.frames.count();
    std::optional<int> last; // frame that was evaluated
    const HostErrors errors;
    AppliedModels models = modelsOf(shot);
    PoseWatch poses(models);
    Progress progress(options.console, "drawing", count);
    for (std::size_t number = 0; number < count; ++number) {
        const int frame = shot.frames.frame(number);
        const std::filesystem::path name = pictureName(pattern, frame, count > 1);
        if (isThere(name, options)) {
            ++answer.skipped;
            progress.advance();
            continue;
        }
        for (const int earlier : shot.part.before(frame))
            if (!last || *last < earlier)
                evaluateBefore(shot, session, errors, earlier);
        last = frame;
        const Stage stage([&] { return "drawing " + name.string(); });
        shot.setTime(session, frame);
        Picture picture(shot.layout.width * static_cast<int>(shot.panels.size()), shot.layout.height);
        const std::vector<ShownJoint> joints = options.hasJoints ? shownJoints() : std::vector<ShownJoint>();
        int left = 0;
        for (std::size_t panel = 0; panel < shot.panels.size(); ++panel) {
            const PanelFrame shown = evaluatePanel(shot.panels[panel], frame);
            for (const MeshFrame& mesh : shown)
                answer.measures[panel].add(mesh.distances);
            drawPanel(picture, shot.layout, left, shot.camera, shot.panels[panel], shown, shot.scale);
            drawJoints(picture, shot.layout, left, shot.camera, joints);
            left += shot.layout.width;
        }
        throwIfAny(errors, frame);
        models.requireSound();
        poses.look(frame);
        storage::WholeFile file(name);
        writePng(file.stream(), picture);
        file.finish();
        answer.pictures.push_back(name);
        progress.advance();
    }
    answer.poses = poses.reports();
}

void writeMeshes(JsonWriter& writer, const Panel& panel, const std::vector<ModelInUse>& models) {
    writer.Key("meshes");
    writer.StartArray();
    for (std::size_t mesh = 0; mesh < panel.meshes.size(); ++mesh) {
        writer.StartObject();
        writeText(writer, "plug", panel.meshes[mesh].mesh.name().asChar());
        if (const HPlug& reference = panel.meshes[mesh].reference; !reference.isNull())
            writeText(writer, "reference", reference.name().asChar());
        writeModel(writer, models[mesh]);
        writer.EndObject();
    }
    writer.EndArray();
}

void writePanels(JsonWriter& writer, const Shot& shot, const Answer& answer) {
    const double millimetres = shot.scale.millimetres / shot.scale.range;
    writer.Key("panels");
    writer.StartArray();
    for (std::size_t panel = 0; panel < shot.panels.size(); ++panel) {
        writer.StartObject();
        writeText(writer, "label", shot.panels[panel].label);
        writeMeshes(writer, shot.panels[panel], shot.models[panel]);
        if (shot.panels[panel].isHeat()) {
            writer.Key("rangeMillimetres");
            writer.Double(shot.scale.millimetres);
            writer.Key("meanMillimetres");
            writer.Double(answer.measures[panel].mean() * millimetres);
            writer.Key("largestMillimetres");
            writer.Double(answer.measures[panel].largest * millimetres);
        }
        writer.EndObject();
    }
    writer.EndArray();
}

std::string jsonOf(const Shot& shot, const Answer& answer, const Options& options) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writer.Key("pictures");
    writer.StartArray();
    for (const std::filesystem::path& picture : answer.pictures)
        writeText(writer, picture.string());
    writer.EndArray();
    writeCount(writer, "skipped", answer.skipped);
    writer.Key("width");
    writer.Uint64(static_cast<std::uint64_t>(shot.layout.width) * shot.panels.size());
    writer.Key("height");
    writer.Int(shot.layout.height);
    writePanels(writer, shot, answer);
    writeGuard(writer, shot.guard ? shot.guard->reports() : std::vector<GuardReport>(), options.guard.width);
    writePoses(writer, answer.poses);
    writer.EndObject();
    return std::string(buffer.GetString()) + "\n";
}

void tell(const Shot& shot, const Answer& answer, const Options& options) {
    const Console& console = options.console;
    if (const std::size_t count = shot.part.whole.count(); count > mostFramesLookedAt && !answer.pictures.empty())
        console.note("the camera and the range of colours are those of " + std::to_string(mostFramesLookedAt) +
                     " of the " + std::to_string(count) + " frames");
    std::set<std::string> notes; // several panels may show the same mesh
    for (const std::vector<ModelInUse>& models : shot.models)
        for (const ModelInUse& model : models)
            if (!model.note.empty() && notes.insert(model.note).second)
                console.note(model.note);
    if (shot.guard)
        noteGuard(console, shot.guard->reports(), options.guard.width);
    notePoses(console, answer.poses);
    if (answer.skipped > 0)
        console.note(std::to_string(answer.skipped) + " frames were left out, whose pictures were there");
    if (answer.pictures.empty())
        return;
    const std::string last = answer.pictures.back().string();
    console.note(answer.pictures.size() == 1 ? "drew " + last
                                             : "drew " + std::to_string(answer.pictures.size()) + " pictures, " +
                                                   answer.pictures.front().string() + " to " + last);
}

void render(const Options& options) {
    watchForInterrupt();
    const View view = viewFrom(options.view, options.up);
    checkPictureName(absolutePath(options.output));
    std::string told;
    {
        const StdoutAside aside;
        SceneSession session(options.scene);
        Shot shot = plan(options, session);
        Answer answer;
        answer.measures.resize(shot.panels.size());
        if (options.guard.isOn)
            shot.guard.emplace(modelsOf(shot).geometries(), options.guard.width);
        if (!areAllThere(shot, options)) {
            look(shot, view, options, session);
            warnOfEmptyPanels(shot, options.console);
        }
        drawPictures(shot, options, session, answer);
        tell(shot, answer, options);
        told = options.console.json ? jsonOf(shot, answer, options) : "";
    }
    std::cout << told;
}

void addWhatIsShown(CLI::App& command, Options& options) {
    command.add_option("--plug", options.plug, "The mesh to show; by default all of the character")->type_name("PLUG");
    // in the order in which they are written, whichever of the two they are
    const auto add = [&options](bool isHeat) {
        return [&options, isHeat](const std::vector<std::string>& texts) {
            for (const std::string& text : texts)
                options.panels.push_back({text, isHeat});
        };
    };
    command
        .add_option_function<std::vector<std::string>>("--panel", add(false), "A panel with a mesh; may be repeated")
        ->type_name("LABEL=PLUG")
        ->allow_extra_args(false)
        ->trigger_on_parse();
    command
        .add_option_function<std::vector<std::string>>(
            "--heat", add(true), "A panel with the distance of a mesh from another; may be repeated")
        ->type_name("LABEL=PLUG:PLUG")
        ->allow_extra_args(false)
        ->trigger_on_parse();
    command.add_option("--range", options.range, "Distance of the last colour; by default the largest, rounded up")
        ->type_name("MM")
        ->check(CLI::PositiveNumber);
    command.add_option("--deformer", options.deformer, "The deformer, where the scene has several")->type_name("NAME");
    command.add_option("--geometry", options.geometry, "The deformer's geometry, where it has several")
        ->type_name("INDEX|NAME");
    addModelOptions(command, options.model);
    addGuardOptions(command, options.guard);
}

} // namespace

void addRenderCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("render", "Draw pictures of the meshes of a scene");
    addSceneOptions(*command, options->scene);
    command->add_option("-o,--output", options->output, "The picture; #### in its name is the frame")
        ->type_name("PICTURE.png")
        ->required();
    command->add_option("--frames", options->frames, "Frames to draw; by default the scene's current one")
        ->type_name("A-B[xS]");
    addPartOptions(*command, options->part, true);
    command->add_flag("--skip-existing", options->skipsExisting, "Leave out the frames whose picture is there");
    addWhatIsShown(*command, *options);
    command->add_option("--size", options->size, "Size of one panel in pixels")
        ->type_name("WxH")
        ->capture_default_str();
    command
        ->add_option("--view", options->view, "front, back, left, right, top, bottom, or AZIMUTH,ELEVATION in degrees")
        ->capture_default_str();
    command
        ->add_option("--frame-on", options->frameOn,
                     "What the camera is on: all, what is moving from frame to frame, or what is differing from panel "
                     "to panel")
        ->capture_default_str();
    command->add_flag("--joints", options->hasJoints, "Draw the joints over every panel");
    command->add_option("--up", options->up, "The axis that points up: x, y or z")->capture_default_str();
    addConsoleOptions(*command, options->console, true);
    addProgressOption(*command, options->console);
    command->callback([options] { render(*options); });
}

} // namespace quarn
