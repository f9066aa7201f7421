// SPDX-License-Identifier: Apache-2.0
// What the steps of a run have to do with each other, for all kinds of runs; and which runs there are none of.
#include "quarn/run/plan.h"

#include "quarn/run/recipe.h"
#include "storage/WholeFile.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <set>

namespace quarn {
namespace {

using testing::Contains;
using testing::HasSubstr;

RunFacts factsOf(const std::vector<std::string>& meshes) {
    RunFacts facts;
    facts.character.emplace();
    for (const std::string& mesh : meshes) {
        facts.character->meshes.push_back({mesh, mesh + "_skin", 10, 12});
        for (const char* step : {"target", "target-1", "target-2", "motion-target"})
            facts.targets[answerFile(step, mesh).string()] = {{mesh + "_target", "/caches/" + mesh + ".npy", {}, {}},
                                                              {}};
    }
    facts.poses = {1, 44};
    facts.motion = {1, 120};
    facts.refined = {{1, 60}, {1, 64}};
    return facts;
}

RunSettings settingsWith(const std::function<void(RunSettings&)>& change) {
    RunSettings settings;
    settings.character = "/rigs/arm.glb";
    settings.samples = 40;
    change(settings);
    return settings;
}

struct Kind {
    const char* name;
    std::vector<std::string> meshes;
    std::function<void(RunSettings&)> change;
};

// two of them: 16 poses, and the 4 that are left
void addInRounds(RunSettings& settings) {
    settings.targetCommand = {"make"};
    settings.samples = 44;
    settings.refineTo = 64;
    settings.refineStep = 16;
    settings.ensemble = 2;
}

void giveSkins(RunSettings& settings) {
    settings.motion = "/rigs/keys.json";
    settings.targetCommand = {"make"};
    settings.skins = {"arm=/caches/dual.npy"};
    settings.motionSkins = {"arm=/caches/motion_dual.npy"};
}

const std::vector<Kind>& kinds() {
    static const std::vector<Kind> all = {
        {"no targets", {"arm"}, [](RunSettings&) {}},
        {"a cache", {"arm"}, [](RunSettings& s) { s.targets = {"/caches/arm.npy"}; }},
        {"a command", {"arm", "eye"}, [](RunSettings& s) { s.targetCommand = {"make"}; }},
        {"a motion by a command",
         {"arm"},
         [](RunSettings& s) {
             s.motion = "/rigs/keys.json";
             s.targetCommand = {"make"};
         }},
        {"rounds", {"arm", "eye"}, addInRounds},
        {"skins", {"arm", "eye"}, giveSkins},
        {"caches of one of two", {"eye", "arm"}, [](RunSettings& s) {
             s.motion = "/rigs/keys.json";
             s.targets = {"arm=/caches/arm.npy"};
             s.motionTargets = {"arm=/caches/arm.npy"};
         }}};
    return all;
}

TEST(Plan, EachStepHasWhatItNeedsFromThoseBefore) {
    for (const Kind& kind : kinds()) {
        const RunFacts all = factsOf(kind.meshes);
        const RunSettings settings = settingsWith(kind.change);
        check(settings);
        std::set<std::string> labels;
        std::set<std::filesystem::path> made;
        for (const Step& step : planOf(settings, all)) {
            EXPECT_TRUE(labels.insert(step.label()).second) << step.label();
            EXPECT_THAT(stepNames(), Contains(step.name));
            for (const auto& input : step.inputs)
                EXPECT_TRUE(input.is_absolute() || made.count(input) > 0)
                    << kind.name << ": " << step.label() << " needs " << input;
            for (const auto& output : step.outputs)
                EXPECT_TRUE(made.insert(output).second) << kind.name << ": " << output << " is made twice";
        }
        EXPECT_EQ(labels.count("report") > 0, settings.hasTargets()) << kind.name;
    }
}

// a run plans again after each step: what it has done already is not to stand elsewhere then
TEST(Plan, GrowsAtItsEndWithWhatIsKnown) {
    const auto labelsOf = [](const RunSettings& settings, const RunFacts& facts) {
        Words labels;
        for (const Step& step : planOf(settings, facts))
            labels.push_back(step.label());
        return labels;
    };
    for (const Kind& kind : kinds()) {
        const RunSettings settings = settingsWith(kind.change);
        const RunFacts all = factsOf(kind.meshes);
        RunFacts known;
        Words before = labelsOf(settings, known);
        EXPECT_EQ(before, Words{"import"});
        for (const auto& learn : std::vector<std::function<void()>>{
                 [&] { known.character = all.character; }, [&] { known.poses = all.poses; },
                 [&] { known.motion = all.motion; }, [&] { known.targets = all.targets; },
                 [&] { known.refined = all.refined; }}) {
            learn();
            // what the poses or the motion have answered is known when their step is done, and the next follows
            Words now = labelsOf(settings, known);
            const auto done = static_cast<std::ptrdiff_t>(std::min<std::size_t>(before.size(), 2));
            ASSERT_GE(now.size(), before.size()) << kind.name;
            EXPECT_TRUE(std::equal(before.begin(), before.begin() + done, now.begin())) << kind.name;
            before = now;
        }
    }
}

TEST(Plan, HoldsTheLastPosesOut) {
    const auto framesOf = [](const Step& step) {
        return *(std::find(step.words.begin(), step.words.end(), "--frames") + 1);
    };
    for (const auto& [change, set, held] :
         {std::tuple<std::function<void(RunSettings&)>, const char*, const char*>{[](RunSettings&) {}, "1-40", "41-44"},
          {[](RunSettings& s) { s.heldOut = 10; }, "1-34", "35-44"},
          {[](RunSettings& s) { s.motion = "/keys.json"; }, "1-44", "1-120"}}) {
        const RunSettings settings = settingsWith([&, &change = change](RunSettings& s) {
            s.targetCommand = {"make"};
            change(s);
        });
        for (const Step& step : planOf(settings, factsOf({"arm"}))) {
            const bool isTrained = step.name == "export", isHeld = step.name == "held-out" || step.name == "play";
            if (isTrained || isHeld) {
                EXPECT_EQ(framesOf(step), isTrained ? set : held);
            }
        }
    }
}

// whatever plays a scene with a skin depends on its file, and is of that skin; a target command gets quarn's own
TEST(Plan, SkinsThatAreGivenAreLearnedOn) {
    RunFacts facts = factsOf({"arm", "eye"});
    for (const char* step : {"target", "motion-target"})
        facts.targets[answerFile(step, "arm").string()].skin = {"arm_skinCache", "caches/arm.npy", {}, {}};
    const auto has = [](const auto& list, const std::string& word) {
        return std::find(list.begin(), list.end(), word) != list.end();
    };
    for (const Step& step : planOf(settingsWith(giveSkins), facts)) {
        SCOPED_TRACE(step.label());
        const bool isArm = step.mesh == "arm";
        EXPECT_EQ(has(step.words, "/caches/dual.npy"), isArm && step.name == "target");
        EXPECT_EQ(has(step.inputs, "/caches/motion_dual.npy"), isArm && step.name == "motion-target");
        const bool isPlaying = isArm && (step.name == "export" || step.name == "held-out");
        EXPECT_EQ(has(step.inputs, "caches/arm.npy"), isPlaying || step.name == "report");
        EXPECT_EQ(has(step.words, "arm_skin.outputGeom[0]"),
                  isArm && (step.name == "skin" || step.name == "motion-skin"));
    }
}

// targets are asked for of what a round has added, and each set has all that there is
TEST(Plan, RoundsTrainOnAllAndAskForWhatIsNew) {
    const auto valueOf = [](const Step& step, const char* flag) {
        return *(std::find(step.words.begin(), step.words.end(), flag) + 1);
    };
    Words told;
    std::set<std::string> seeds;
    for (const Step& step : planOf(settingsWith(addInRounds), factsOf({"arm"}))) {
        if (step.request)
            told.push_back(step.label() + " " + step.request->known.string() + " " +
                           framesText({step.request->firstFrame, step.request->lastFrame}));
        else if (step.name == "ensemble-set" || step.name == "export")
            told.push_back(step.label() + " " + valueOf(step, "--frames"));
        else if (step.name == "refine")
            told.push_back(step.label() + " " + step.words[1] + " adds " + valueOf(step, "--add"));
        else if (step.name == "ensemble")
            seeds.insert(valueOf(step, "--seed"));
        else if (step.name == "motion")
            told.push_back(step.label() + " " + valueOf(step, "--samples"));
    }
    EXPECT_THAT(told, testing::ElementsAre("motion 4", "targets  1-44", "motion-targets  1-120", "ensemble-set 1 1-44",
                                           "refine 1 poses.json adds 16", "targets 1 data/arm/poses_target.npy 45-60",
                                           "ensemble-set 2 1-60", "refine 2 refined1.json adds 4",
                                           "targets 2 data/arm/refined1_target.npy 61-64", "export 1-64"));
    EXPECT_EQ(seeds, (std::set<std::string>{"2", "3"}));
}

// by measurement where nobody has said one, and always the same of what is trained and what is held out
TEST(Plan, ChoosesAKindOfDeltasOnce) {
    const Kind& kind = kinds().back();
    for (const auto& [imports, exporting, isChosen] : {std::tuple<Words, Words, bool>{{"--with-roots"}, {}, true},
                                                       {{"--delta-mode", "offset"}, {}, false},
                                                       {{"--smoothing=5"}, {}, false},
                                                       {{}, {"--like", "other"}, false}}) {
        RunSettings settings = settingsWith(kind.change);
        settings.importOptions = imports;
        settings.exportOptions = exporting;
        for (const Step& step : planOf(settings, factsOf(kind.meshes))) {
            const auto has = [&, &words = step.words](const std::string& word) {
                return std::find(words.begin(), words.end(), word) != words.end();
            };
            const std::string set = "data/" + step.mesh + "/set";
            EXPECT_EQ(has("auto"), isChosen && step.name == "export") << step.label();
            const bool isLike = step.name == "held-out" && has("--like") && has(set);
            EXPECT_EQ(isLike, isChosen && step.name == "held-out") << step.label();
            if (isLike) {
                EXPECT_THAT(step.inputs, Contains(set + "/dataset.json"));
            }
        }
    }
}

TEST(Plan, ReportsOnEachMeshThatHasAModel) {
    for (const Kind& kind : {kinds()[2], kinds().back()}) { // arm and eye; arm, behind eye
        RunSettings settings = settingsWith(kind.change);
        settings.renderOptions = {"--view", "15,15"};
        settings.reportOptions = {"--judge"};
        const Plan plan = planOf(settings, factsOf(kind.meshes));
        const Words& words = plan.back().words;
        const std::string scene = settings.motion.empty() ? "poses" : "motion";
        for (const std::string mesh : {"arm", "eye"}) {
            const bool isThere = mesh == "arm" || settings.motion.empty();
            for (const std::string& word :
                 {mesh + "=" + scene + "." + mesh + ".json", mesh + "=" + mesh, mesh + "=data/" + mesh + "/training"})
                EXPECT_EQ(std::count(words.begin(), words.end(), word) > 0, isThere) << kind.name << " " << word;
        }
        EXPECT_EQ(std::count(words.begin(), words.end(), "--poses") > 0, settings.motion.empty());
        EXPECT_THAT(words, testing::IsSupersetOf({"--render-option=--view", "--render-option=15,15"}));
        EXPECT_EQ(words.back(), "--judge");
    }
}

TEST(Plan, RefusesTargetsThatAreNobodys) {
    struct Row {
        std::vector<std::string> meshes;
        Words targets;
        const char* sentence;
    };
    for (const Row& row : {Row{{"arm", "eye"}, {"/a.npy"}, "several meshes, arm, eye: whose targets are in /a.npy"},
                           Row{{"arm"}, {"leg=/a.npy"}, "targets of \"leg\", and no mesh of that name"},
                           Row{{"arm"}, {"arm=/a.npy", "/b.npy"}, "two files with targets of arm"},
                           Row{{}, {"/a.npy"}, "/rigs/arm.glb has no mesh that joints or weights move"}}) {
        const RunSettings settings = settingsWith([&](RunSettings& s) { s.targets = row.targets; });
        EXPECT_THAT(failureOf([&] { planOf(settings, factsOf(row.meshes)); }), HasSubstr(row.sentence));
    }
    const RunSettings few = settingsWith([](RunSettings& s) {
        s.targets = {"/a.npy"};
        s.heldOut = 43;
    });
    EXPECT_THAT(failureOf([&] { planOf(few, factsOf({"arm"})); }), HasSubstr("when 43 are held out too few are left"));
}

// --- what is asked for ---

TEST(Recipe, IsReadFromItsFolderAndFlagsComeBeforeIt) {
    const TemporaryFolder folder;
    const auto file = folder.path() / "recipe.json";
    storage::writeWhole(folder.path() / "make.py", "");
    storage::writeWhole(file, R"({"character": "arm.glb", "samples": 7, "epochs": 9, "activation-rate": 0.5,
        "motion": "../keys.json", "motion-targets": ["arm=m.npy"], "train-option": ["--patience", "make.py"],
        "target-command": ["python3", "make.py", "--deep"]})");
    RunSettings settings;
    settings.epochs = 3;
    readRecipe(
        file, settings, [](const std::string& name) { return name == "epochs"; }, true);
    EXPECT_EQ(settings.character, folder.path() / "arm.glb");
    EXPECT_EQ(settings.motion, folder.path().parent_path() / "keys.json");
    EXPECT_EQ(settings.motionTargets, Words{"arm=" + (folder.path() / "m.npy").string()});
    EXPECT_EQ(settings.targetCommand, (Words{"python3", (folder.path() / "make.py").string(), "--deep"}));
    EXPECT_EQ(settings.trainOptions.back(), (folder.path() / "make.py").string());
    EXPECT_EQ(settings.samples, 7);
    EXPECT_EQ(settings.activationRate, 0.5);
    EXPECT_EQ(settings.epochs, 3);
}

TEST(Recipe, RefusesWhatItDoesNotKnow) {
    const TemporaryFolder folder;
    const auto file = folder.path() / "recipe.json";
    for (const auto& [text, sentence] :
         {std::pair(R"(["arm.glb"])", "is no recipe"), std::pair(R"({"sample": 7})", "the key \"sample\""),
          std::pair(R"({"samples": 7.5})", "\"samples\" that is not a whole number"),
          std::pair(R"({"motion": 5})", "\"motion\" that is not a text"),
          std::pair(R"({"align": 1})", "\"align\" that is not true or false"),
          std::pair(R"({"targets": ["a", 5]})", "\"targets\" that is not a text"),
          std::pair(R"({"targets": {}})", "\"targets\" that is not a text, or a list of texts"),
          std::pair(R"({"target-command": ["rm"]})", "would start a program"),
          std::pair(R"({"train-option": ["--epochs", "3", "--quarn=/x"]})",
                    "\"--quarn=/x\" among its \"train-option\""),
          std::pair(R"({"import-option": "-p/x.so"})", "--allow-commands lets it"), std::pair("{", "line 1")}) {
        storage::writeWhole(file, text);
        RunSettings settings;
        const auto none = [](const std::string&) { return false; };
        EXPECT_THAT(failureOf([&] { readRecipe(file, settings, none, false); }),
                    testing::AllOf(HasSubstr(file.string()), HasSubstr(sentence)));
    }
}

TEST(Settings, ThatNoRunCanHaveAreRefusedWithTheirValue) {
    const std::vector<std::pair<std::function<void(RunSettings&)>, const char*>> rows = {
        {[](RunSettings& s) { s.character.clear(); }, "CHARACTER is missing"},
        {[](RunSettings& s) { s.samples = 1; }, "samples is 1, not a whole number from 2"},
        {[](RunSettings& s) { s.heldOut = 2; }, "held-out is 2"},
        {[](RunSettings& s) { s.activationRate = 1.5; }, "activation-rate is 1.5"},
        {[](RunSettings& s) { s.limitRate = -0.5; }, "limit-rate is -0.5"},
        {[](RunSettings& s) { s.order = "files"; }, "order is \"files\", not one of scene, file, rest"},
        {[](RunSettings& s) { s.scale = 0.0; }, "scale is 0, not a number above 0"},
        {[](RunSettings& s) { s.order = "rest", s.targetCommand = {"x"}; }, "are for --targets"},
        {[](RunSettings& s) { s.from = "animation"; }, "are for poses from limits"},
        {[](RunSettings& s) { s.targets = s.targetCommand = {"x"}; }, "not from both"},
        {[](RunSettings& s) { s.motion = "/k", s.targets = {"/x"}; }, "--motion has to have targets as well"},
        {[](RunSettings& s) { s.motion = "/k", s.heldOut = 9; }, "not both"},
        {[](RunSettings& s) { s.motionTargets = {"/x"}; }, "give it with --motion"},
        {[](RunSettings& s) { s.skins = {"/x"}; }, "give it with --targets"},
        {[](RunSettings& s) { giveSkins(s), s.motionSkins.clear(); }, "--motion has to have a skin as well"},
        {[](RunSettings& s) { giveSkins(s), s.motion.clear(); }, "--motion-skin is the skin of a motion: give it with"},
        {[](RunSettings& s) { giveSkins(s), s.skins.clear(); }, "give that of the poses as well"},
        {[](RunSettings& s) { addInRounds(s), s.skins = {"/x"}; }, "--skin is not for --refine-to"},
        {[](RunSettings& s) { s.targetPart = 9; }, "are for a --target-command"},
        {[](RunSettings& s) { s.refineTo = 60; }, "--refine-to needs a --target-command"},
        {[](RunSettings& s) { addInRounds(s), s.refineTo = 44; }, "refine-to is 44, and there are 44 samples"},
        {[](RunSettings& s) { addInRounds(s), s.ensemble = 1; }, "ensemble is 1, not a whole number from 2"},
        {[](RunSettings& s) { addInRounds(s), s.refineTo = 9999, s.refineStep = 1; }, "makes 9955 rounds"},
        {[](RunSettings& s) { addInRounds(s), s.from = "both"; }, "from is \"both\""},
        {[](RunSettings& s) { s.ensemble = 3; }, "are for --refine-to"}};
    for (const auto& [change, sentence] : rows)
        EXPECT_THAT(failureOf([&, &change = change] { check(settingsWith(change)); }), HasSubstr(sentence));
}

} // namespace
} // namespace quarn
