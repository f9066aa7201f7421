// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/plan.h"

#include "quarn/run/characterFiles.h"

#include <algorithm>
#include <charconv>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr std::int64_t leastHeldOut = 3; // a second difference is the least that can be said of a motion

std::string decimal(double value) {
    std::string digits(32, '\0');
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), value).ptr;
    return {digits.data(), end};
}

std::string joined(const Words& words) {
    std::string text;
    for (const std::string& word : words)
        text += (text.empty() ? "" : ", ") + word;
    return text;
}

std::int64_t heldOutOf(const RunSettings& settings, std::int64_t all) {
    return settings.motion.empty() ? settings.heldOut.value_or(std::max(leastHeldOut, all / 10)) : 0;
}

// without these flags and their values, as "--flag" "VALUE" or "--flag=VALUE"
Words withoutFlags(const Words& words, const Words& flags) {
    const auto isFlag = [&](const std::string& word) {
        return std::find(flags.begin(), flags.end(), word) != flags.end();
    };
    Words kept;
    for (auto word = words.begin(); word != words.end(); ++word) {
        if (isFlag(*word))
            word += word + 1 == words.end() ? 0 : 1;
        else if (!isFlag(word->substr(0, word->find('='))))
            kept.push_back(*word);
    }
    return kept;
}

// whether one of these flags is among the words, as "--flag" or "--flag=VALUE"
bool hasFlag(const Words& words, const Words& flags) {
    return std::any_of(words.begin(), words.end(), [&](const std::string& word) {
        return std::find(flags.begin(), flags.end(), word.substr(0, word.find('='))) != flags.end();
    });
}

// of one mesh: whole paths by its name, or one without a name that is for the only mesh there is; `what` they hold
std::map<std::string, fs::path> filesByMesh(const Words& caches, const CharacterFacts& character,
                                            const std::string& what) {
    Words names;
    for (const MeshFacts& mesh : character.meshes)
        names.push_back(mesh.name);
    std::map<std::string, fs::path> files;
    for (const std::string& word : caches) {
        const std::size_t equals = word.front() == '/' ? std::string::npos : word.find('=');
        const std::string mesh = equals == std::string::npos ? names.front() : word.substr(0, equals);
        if (equals == std::string::npos && names.size() > 1)
            throw std::runtime_error("the character has several meshes, " + joined(names) + ": whose " + what +
                                     " are in " + word + "? Give them as MESH=FILE");
        if (std::find(names.begin(), names.end(), mesh) == names.end())
            throw std::runtime_error("there are " + what + " of \"" + mesh + "\", and no mesh of that name that " +
                                     "something moves; there is " + joined(names));
        if (!files.emplace(mesh, equals == std::string::npos ? word : word.substr(equals + 1)).second)
            throw std::runtime_error("there are two files with " + what + " of " + mesh);
    }
    return files;
}

/// Puts the steps together, one kind after the other.
class Planner {
public:
    Planner(const RunSettings& settings, const RunFacts& facts)
        : settings_(settings)
        , facts_(facts) {}

    Plan plan() {
        import();
        if (!facts_.character)
            return plan_;
        requireMeshes();
        poses();
        if (hasMotion())
            motion();
        else if (settings_.refines())
            heldOutPoses();
        each([&](const MeshFacts& mesh) { rest(mesh); });
        skins("skin", "poses", facts_.poses);
        if (hasHeldScene())
            skins("motion-skin", "motion", facts_.motion);
        if (!settings_.hasTargets() || !facts_.poses || (hasHeldScene() && !facts_.motion))
            return plan_;
        posed_ = {"poses", 0, *facts_.poses};
        targets();
        while (posed_.round < static_cast<std::size_t>(settings_.rounds()))
            if (!refine())
                return plan_;
        models();
        return plan_;
    }

private:
    /// A scene with poses to train: those that were drawn, or those that a round has added to them.
    struct Posed {
        std::string scene;
        std::size_t round = 0;
        FrameSpan frames;
    };

    bool hasMotion() const { return !settings_.motion.empty(); }
    // rounds add poses behind those that are there: what is held out is not among them
    bool hasHeldScene() const { return hasMotion() || settings_.refines(); }
    // of skins; targets in the order of the rest pose are made to fit those of the scene
    std::string order() const { return settings_.order == "file" ? "file" : "scene"; }
    std::string dataOf(const MeshFacts& mesh) const { return "data/" + mesh.name; }
    std::string heldScene() const { return hasHeldScene() ? "motion" : "poses"; }
    FrameSpan heldFrames() const { return hasHeldScene() ? *facts_.motion : heldOutFrames(settings_, *facts_.poses); }

    template <class Do>
    void each(const Do& action) {
        for (const MeshFacts& mesh : facts_.character->meshes)
            action(mesh);
    }
    template <class Do>
    void eachChosen(const Do& action) {
        const MeshChoice choice = chooseMeshes(settings_, *facts_.character);
        each([&](const MeshFacts& mesh) {
            if (std::find(choice.chosen.begin(), choice.chosen.end(), mesh.name) != choice.chosen.end())
                action(mesh);
        });
    }

    Step& add(const char* name, const MeshFacts* mesh, Words words, std::vector<fs::path> inputs,
              std::vector<fs::path> outputs) {
        Step step{name,
                  mesh != nullptr && facts_.character->meshes.size() > 1 ? mesh->name : "",
                  {},
                  Program::quarn,
                  std::move(words),
                  std::move(inputs),
                  std::move(outputs),
                  {},
                  {},
                  {}};
        plan_.push_back(std::move(step));
        return plan_.back();
    }
    // its answer is kept as JSON, in the place that facts are read from
    Step& addAnswering(const char* name, const MeshFacts* mesh, Words words, std::vector<fs::path> inputs,
                       std::vector<fs::path> outputs, std::size_t round = 0) {
        Step& step = add(name, mesh, std::move(words), std::move(inputs), std::move(outputs));
        setRound(step, round);
        step.words.emplace_back("--json");
        step.answer = answerFile(ofRound(name, round), mesh != nullptr ? mesh->name : "");
        step.outputs.push_back(step.answer);
        return step;
    }
    static void setRound(Step& step, std::size_t round) {
        if (round > 0)
            step.round = std::to_string(round);
    }
    static void append(Words& words, const Words& more) { words.insert(words.end(), more.begin(), more.end()); }
    static void appendFile(Step& step, const char* flag, const fs::path& file) {
        if (file.empty())
            return;
        append(step.words, {flag, file.string()});
        step.inputs.push_back(file);
    }

    void import() {
        Step& step = addAnswering("import", nullptr,
                                  {"import", settings_.character.string(), "-o", "character.json", "--neural-warp"},
                                  characterFiles(settings_.character), {"character.json"});
        appendFile(step, "--parents", settings_.parents);
        if (facts_.areLimitsEdited && settings_.limits.empty()) {
            appendFile(step, "--limits", limitsFile);
            return append(step.words, withoutFlags(settings_.importOptions, {"--limits-from", "--limits-margin"}));
        }
        appendFile(step, "--limits", settings_.limits);
        if (settings_.limits.empty()) {
            append(step.words, {"--write-limits", limitsFile});
            step.outputs.emplace_back(limitsFile);
            step.replaced.emplace_back(limitsFile);
        }
        append(step.words, settings_.importOptions);
    }

    void requireMeshes() const {
        if (facts_.character->meshes.empty())
            throw std::runtime_error(settings_.character.string() +
                                     " has no mesh that joints or weights move: there is nothing to pose");
        if (settings_.hasTargets())
            static_cast<void>(chooseMeshes(settings_, *facts_.character));
    }

    void poses() {
        const std::int64_t samples = settings_.sampleCount();
        sample("poses", samples + (hasHeldScene() ? 0 : heldOutOf(settings_, samples)), settings_.seed);
    }

    // with another seed, as a scene of their own
    void heldOutPoses() {
        sample("motion", heldOutOf(settings_, settings_.sampleCount()), settings_.seed.value_or(1) + 1);
    }

    void sample(const char* name, std::int64_t count, const std::optional<std::int64_t>& seed) {
        const std::string scene = name;
        Step& step =
            addAnswering(name, nullptr, {"pose", "character.json", "-o", scene + ".json", "--write", scene + ".glb"},
                         {"character.json"}, {scene + ".json", scene + ".glb"});
        if (!settings_.from.empty())
            append(step.words, {"--from", settings_.from});
        if (settings_.from != "animation")
            append(step.words, {"--samples", std::to_string(count)});
        if (settings_.activationRate)
            append(step.words, {"--activation-rate", decimal(*settings_.activationRate)});
        if (settings_.limitRate)
            append(step.words, {"--limit-rate", decimal(*settings_.limitRate)});
        if (seed)
            append(step.words, {"--seed", std::to_string(*seed)});
        append(step.words, settings_.poseOptions);
    }

    void motion() {
        addAnswering("motion", nullptr,
                     {"pose", "character.json", "--keys", settings_.motion.string(), "-o", "motion.json", "--write",
                      "motion.glb"},
                     {"character.json", settings_.motion}, {"motion.json", "motion.glb"});
    }

    // a mesh plug, in the order that targets have, frame by frame
    Step& addPoints(const char* name, const MeshFacts& mesh, const std::string& scene, const std::string& plug,
                    const FrameSpan& frames, const std::string& file, const std::string& vertexOrder) {
        return add(name, &mesh,
                   {"play", scene, "--plug", plug, "--geometry", mesh.name, "--no-model", "--frames",
                    framesText(frames), "--order", vertexOrder, "-o", file},
                   {scene}, {file});
    }

    void rest(const MeshFacts& mesh) {
        addPoints("rest", mesh, "character.json", mesh.name + ".outMesh", {1, 1}, dataOf(mesh) + "/rest.npy", order());
    }

    void skins(const char* name, const std::string& scene, const std::optional<FrameSpan>& frames) {
        if (!frames)
            return;
        each([&](const MeshFacts& mesh) {
            setRound(addPoints(name, mesh, scene + ".json", mesh.skin + ".outputGeom[0]", *frames,
                               skinFile(scene, mesh.name).string(), order()),
                     posed_.round);
        });
    }

    // --- with targets ---

    void targets() {
        makeTargets("targets", "poses", settings_.targets, posed_.frames, {});
        connectTargets("target", "poses", settings_.skins);
        if (!hasHeldScene())
            return;
        makeTargets("motion-targets", "motion", settings_.motionTargets, *facts_.motion, {});
        connectTargets("motion-target", "motion", settings_.motionSkins);
    }

    // `frames` are those that are made; those of the scene `known` are there
    void makeTargets(const char* name, const std::string& scene, const Words& given, const FrameSpan& frames,
                     const std::string& known) {
        const std::map<std::string, fs::path> files = filesByMesh(given, *facts_.character, "targets");
        eachChosen([&](const MeshFacts& mesh) {
            const auto file = files.find(mesh.name);
            if (file == files.end() && settings_.targetCommand.empty())
                throw std::runtime_error("there are targets of the poses of " + mesh.name + ", and none of its motion");
            if (!settings_.targetCommand.empty())
                askFor(name, mesh, scene, frames, known);
            caches_[mesh.name] = settings_.targetCommand.empty() ? file->second : targetFile(scene, mesh);
        });
    }

    fs::path targetFile(const std::string& scene, const MeshFacts& mesh) const {
        return dataOf(mesh) + "/" + scene + "_target.npy";
    }

    // those that were made, and skins that were given
    void connectTargets(const char* name, const std::string& scene, const Words& skins) {
        const std::map<std::string, fs::path> skinOf = filesByMesh(skins, *facts_.character, "skins");
        eachChosen([&](const MeshFacts& mesh) {
            const fs::path& cache = caches_.at(mesh.name);
            const std::string output = scene + "." + mesh.name + ".json";
            Step& step = addAnswering(name, &mesh,
                                      {"target", scene + ".json", "--cache", cache.string(), "--geometry", mesh.name,
                                       "--order", settings_.order.empty() ? "scene" : settings_.order, "-o", output},
                                      {scene + ".json", cache}, {output}, posed_.round);
            if (const auto skin = skinOf.find(mesh.name); skin != skinOf.end())
                appendFile(step, "--skin", skin->second);
            if (!settings_.axes.empty())
                append(step.words, {"--axes", settings_.axes});
            if (settings_.scale)
                append(step.words, {"--scale", decimal(*settings_.scale)});
            if (settings_.align)
                step.words.emplace_back("--align");
            if (settings_.anyway)
                step.words.emplace_back("--anyway");
            append(step.words, settings_.targetOptions);
        });
    }

    void askFor(const char* name, const MeshFacts& mesh, const std::string& scene, const FrameSpan& frames,
                const std::string& known) {
        const fs::path skin = skinFile(scene, mesh.name);
        const std::string rest = dataOf(mesh) + "/rest.npy";
        Step& step = add(name, &mesh, settings_.targetCommand,
                         {settings_.character, scene + ".glb", scene + ".json", rest, skin}, {targetFile(scene, mesh)});
        step.program = Program::targetCommand;
        setRound(step, posed_.round);
        TargetRequest& request = step.request.emplace();
        if (!known.empty()) {
            request.known = targetFile(known, mesh);
            step.inputs.push_back(request.known);
        }
        request.mesh = mesh.name;
        request.character = settings_.character;
        request.skeleton = scene + ".glb";
        request.scene = scene + ".json";
        request.rest = rest;
        request.skin = skin;
        request.order = order();
        request.vertices = order() == "file" ? mesh.fileVertices : mesh.vertices;
        request.firstFrame = frames.first;
        request.lastFrame = frames.last;
        request.metersPerUnit = facts_.character->metersPerUnit;
        request.part = settings_.targetPart.value_or(0);
        request.timeout = settings_.targetTimeout.value_or(0);
    }

    // as the scene plays it: the file that was given, or what quarn target has made of it; none before that is done
    const TargetFacts* targetOf(const std::string& scene, const MeshFacts& mesh) const {
        const std::string step = scene == "motion" ? "motion-target" : ofRound("target", posed_.round);
        const auto found = facts_.targets.find(answerFile(step, mesh.name));
        return found == facts_.targets.end() ? nullptr : &found->second;
    }
    bool hasTargetsOf(const std::string& scene) {
        bool isKnown = true;
        eachChosen([&](const MeshFacts& mesh) { isKnown = isKnown && targetOf(scene, mesh) != nullptr; });
        return isKnown;
    }

    // the files that such a scene plays
    std::vector<fs::path> playedBy(const std::string& scene, const MeshFacts& mesh) const {
        const TargetFacts& facts = *targetOf(scene, mesh);
        std::vector<fs::path> files{scene + "." + mesh.name + ".json", facts.cache};
        if (facts.skin)
            files.push_back(facts.skin->cache);
        return files;
    }

    // --- rounds that add poses where models disagree ---

    // false where no more can be told
    bool refine() {
        if (!hasTargetsOf(posed_.scene))
            return false;
        const Posed before = posed_;
        const std::size_t round = before.round + 1;
        const std::string scene = "refined" + std::to_string(round);
        const Words models = ensemble(round);
        Step& step = addAnswering("refine", nullptr,
                                  {"pose", before.scene + ".json", "-o", scene + ".json", "--write", scene + ".glb",
                                   "--add", std::to_string(settings_.addedIn(static_cast<std::int64_t>(round)))},
                                  {before.scene + ".json"}, {scene + ".json", scene + ".glb"}, round);
        if (settings_.seed)
            append(step.words, {"--seed", std::to_string(*settings_.seed)});
        step.words.emplace_back("--refine");
        append(step.words, models);
        step.inputs.insert(step.inputs.end(), models.begin(), models.end());
        if (facts_.refined.size() < round)
            return false;
        posed_ = {scene, round, facts_.refined[round - 1]};
        const FrameSpan added{before.frames.last + 1, posed_.frames.last};
        skins("skin", scene, added);
        makeTargets("targets", scene, {}, added, before.scene);
        connectTargets("target", scene, {});
        return true;
    }

    // models of the poses that there are
    Words ensemble(std::size_t round) {
        const std::string set = posed_.scene + "_set";
        Words models;
        eachChosen([&](const MeshFacts& mesh) {
            setRound(exportFrames("ensemble-set", mesh, posed_.scene, posed_.frames, set), round);
        });
        eachChosen([&](const MeshFacts& mesh) {
            for (std::int64_t member = 1; member <= settings_.ensemble.value_or(3); ++member) {
                const std::string number = std::to_string(member);
                const std::string name = "ensemble/" + posed_.scene + "." + mesh.name + "." + number;
                Step& step = trainOf("ensemble", mesh, dataOf(mesh) + "/" + set, name + ".nwrp", name + ".report",
                                     settings_.ensembleEpochs ? settings_.ensembleEpochs : settings_.epochs);
                step.round = std::to_string(round) + "." + number;
                // the last one counts: whatever is among the options, members differ
                append(step.words, {"--seed", std::to_string(settings_.seed.value_or(1) + member)});
                models.push_back(name + ".nwrp");
            }
        });
        return models;
    }

    void models() {
        if (!hasTargetsOf(posed_.scene) || !hasTargetsOf(heldScene()))
            return;
        const FrameSpan held = heldFrames();
        const FrameSpan trained{posed_.frames.first, hasHeldScene() ? posed_.frames.last : held.first - 1};
        eachChosen([&](const MeshFacts& mesh) { exportFrames("export", mesh, posed_.scene, trained, "set"); });
        eachChosen([&](const MeshFacts& mesh) { exportFrames("held-out", mesh, heldScene(), held, "heldOut"); });
        eachChosen([&](const MeshFacts& mesh) { train(mesh); });
        eachChosen([&](const MeshFacts& mesh) { evaluate(mesh); });
        report(held);
    }

    // what nobody has said is measured, on poses that are trained; frames held out get the same
    void addKind(Step& step, const MeshFacts& mesh) const {
        if (hasFlag(settings_.importOptions, {"--delta-mode", "--smoothing"}) ||
            hasFlag(settings_.exportOptions, {"--smoothing", "--like"}))
            return;
        if (step.name != "held-out")
            return append(step.words, {"--smoothing", "auto"});
        const std::string set = dataOf(mesh) + "/set";
        append(step.words, {"--like", set});
        step.inputs.emplace_back(set + "/dataset.json");
    }

    static std::vector<fs::path> setFiles(const std::string& folder) {
        return {folder + "/dataset.json", folder + "/controls.npy", folder + "/deltas.npy", folder + "/frames.npy",
                folder + "/skin.npy"};
    }

    Step& exportFrames(const char* name, const MeshFacts& mesh, const std::string& scene, const FrameSpan& frames,
                       const std::string& set) {
        const std::string file = scene + "." + mesh.name + ".json";
        const std::string folder = dataOf(mesh) + "/" + set;
        Step& step =
            add(name, &mesh,
                {"export", file, "--geometry", mesh.name, "--frames", framesText(frames), "-o", folder,
                 "--overwrite"}, // the ledger knows whether it is to be made again; what was begun is gone on with
                playedBy(scene, mesh), setFiles(folder));
        addKind(step, mesh);
        if (settings_.anyway)
            step.words.emplace_back("--anyway");
        append(step.words, settings_.exportOptions);
        return step;
    }

    void train(const MeshFacts& mesh) {
        Step& step = trainOf("train", mesh, dataOf(mesh) + "/set", "models/" + mesh.name + ".nwrp",
                             dataOf(mesh) + "/training", settings_.epochs);
        if (settings_.seed) // what is among the options comes before it
            step.words.insert(step.words.begin() + 6, {"--seed", std::to_string(*settings_.seed)});
    }

    Step& trainOf(const char* name, const MeshFacts& mesh, const std::string& set, const std::string& model,
                  const std::string& training, const std::optional<std::int64_t>& epochs) {
        Step& step =
            add(name, &mesh, {"train", set, "-o", model, "--report", training}, setFiles(set), {model, training});
        step.program = Program::trainer;
        if (epochs)
            append(step.words, {"--epochs", std::to_string(*epochs)});
        // what a node made by hand has not, and nearly every mesh is the better for; a flag of the user's comes behind
        const auto& own = settings_.trainOptions;
        if (std::find(own.begin(), own.end(), "--direct") == own.end())
            step.words.emplace_back("--principal-shapes");
        append(step.words, {"--activation", "SiLU", "--linear-path", "--local-neurons"});
        step.words.emplace_back("--resume-if-fits"); // of a training of the same that was interrupted
        append(step.words, own);
        return step;
    }

    void evaluate(const MeshFacts& mesh) {
        const std::string set = dataOf(mesh) + "/heldOut";
        const std::string model = "models/" + mesh.name + ".nwrp";
        std::vector<fs::path> inputs = setFiles(set);
        inputs.emplace_back(model);
        addAnswering("evaluate", &mesh, {"evaluate", set, model}, inputs, {}).program = Program::trainer;
    }

    // a row for each mesh that has a model
    void report(const FrameSpan& held) {
        Words words{"report"}, more;
        std::vector<fs::path> inputs;
        eachChosen([&](const MeshFacts& mesh) {
            const std::string scene = heldScene() + "." + mesh.name + ".json";
            const std::string training = dataOf(mesh) + "/training";
            const std::string evaluation = answerFile("evaluate", mesh.name).string();
            words.push_back(mesh.name + "=" + scene);
            for (const auto& [flag, value] : {std::pair("--geometry", mesh.name), std::pair("--model", mesh.name),
                                              std::pair("--training", training), std::pair("--evaluate", evaluation)})
                append(more, {flag, mesh.name + "=" + value});
            for (const fs::path& file : playedBy(heldScene(), mesh))
                inputs.push_back(file);
            inputs.insert(inputs.end(), {"models/" + mesh.name + ".nwrp", training, evaluation});
        });
        append(words, {"-o", ".", "--title", settings_.character.stem().string(), "--frames", framesText(held)});
        append(words, more);
        if (!hasMotion())
            words.emplace_back("--poses");
        for (const std::string& word : settings_.renderOptions)
            words.push_back("--render-option=" + word);
        append(words, settings_.reportOptions);
        add("report", nullptr, std::move(words), std::move(inputs), {"report.json", "report.html", "table.txt"});
    }

    const RunSettings& settings_;
    const RunFacts& facts_;
    Plan plan_;
    Posed posed_;
    std::map<std::string, fs::path> caches_; ///< of targets, by mesh: those that were planned last
};

} // namespace

Plan planOf(const RunSettings& settings, const RunFacts& facts) {
    return Planner(settings, facts).plan();
}

const Words& stepNames() {
    static const Words names = {"import",  "poses",  "motion",         "rest",          "skin",         "motion-skin",
                                "targets", "target", "motion-targets", "motion-target", "ensemble-set", "ensemble",
                                "refine",  "export", "held-out",       "train",         "evaluate",     "report"};
    return names;
}

MeshChoice chooseMeshes(const RunSettings& settings, const CharacterFacts& character) {
    const std::map<std::string, fs::path> files = filesByMesh(settings.targets, character, "targets");
    MeshChoice choice;
    for (const MeshFacts& mesh : character.meshes)
        (!settings.targetCommand.empty() || files.count(mesh.name) > 0 ? choice.chosen : choice.leftOut)
            .push_back(mesh.name);
    return choice;
}

FrameSpan heldOutFrames(const RunSettings& settings, const FrameSpan& poses) {
    const std::int64_t all = settings.from == "animation" ? poses.count() : settings.sampleCount();
    const std::int64_t held = heldOutOf(settings, all);
    if (poses.count() - held < 2)
        throw std::runtime_error(
            "there are " + std::to_string(poses.count()) + " poses: when " + std::to_string(held) +
            " are held out too few are left to train with; give more samples or a smaller held-out");
    return {poses.last - static_cast<int>(held) + 1, poses.last};
}

std::string framesText(const FrameSpan& span) {
    return std::to_string(span.first) + "-" + std::to_string(span.last);
}

fs::path skinFile(const std::string& scene, const std::string& mesh) {
    return fs::path("data") / mesh / (scene + "_skin.npy");
}

} // namespace quarn
