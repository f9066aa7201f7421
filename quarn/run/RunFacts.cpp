// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/RunFacts.h"

#include "storage/Json.h"

#include <limits>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using storage::JsonValue;

const JsonValue& memberOf(const JsonValue& object, const char* name) {
    if (!object.IsObject() || !object.HasMember(name))
        throw std::runtime_error(std::string("has no ") + name);
    return object[name];
}

std::string textOf(const JsonValue& object, const char* name) {
    const JsonValue& value = memberOf(object, name);
    if (!value.IsString())
        throw std::runtime_error(std::string(name) + " is no text");
    return std::string(storage::viewOf(value));
}

double numberOf(const JsonValue& object, const char* name) {
    const JsonValue& value = memberOf(object, name);
    if (!value.IsNumber())
        throw std::runtime_error(std::string(name) + " is no number");
    return value.GetDouble();
}

std::size_t countOf(const JsonValue& object, const char* name) {
    const double number = numberOf(object, name);
    if (!(number >= 0.0 && number <= std::numeric_limits<std::int32_t>::max()))
        throw std::runtime_error(std::string(name) + " is no count");
    return static_cast<std::size_t>(number);
}

int frameOf(const JsonValue& object, const char* name) {
    const JsonValue& value = memberOf(object, name);
    if (!value.IsInt())
        throw std::runtime_error(std::string(name) + " is no frame");
    return value.GetInt();
}

CharacterFacts characterIn(const JsonValue& answer) {
    CharacterFacts facts{numberOf(answer, "metersPerUnit"), {}};
    const JsonValue& meshes = memberOf(answer, "meshes");
    if (!meshes.IsArray())
        throw std::runtime_error("meshes is no list");
    for (const JsonValue& mesh : meshes.GetArray())
        if (const std::string skin = textOf(mesh, "skin"); !skin.empty())
            facts.meshes.push_back(
                {textOf(mesh, "node"), skin, countOf(mesh, "vertices"), countOf(mesh, "fileVertices")});
    return facts;
}

// what lies beside the scene, which is in the run's folder, is named from there: the folder can be moved
fs::path besideScene(const fs::path& file, const fs::path& scene) {
    const fs::path relative = file.lexically_relative(scene.parent_path());
    return relative.empty() || *relative.begin() == ".." ? file : relative;
}

std::optional<double> lengthIn(const JsonValue& answer, const char* name) {
    const bool isThere = answer.IsObject() && answer.HasMember("fit") && answer["fit"].IsObject() &&
                         answer["fit"].HasMember(name) && answer["fit"][name].IsNumber();
    return isThere ? std::optional(answer["fit"][name].GetDouble()) : std::nullopt;
}

CacheFacts cacheIn(const JsonValue& object, const char* node, const std::string& scene) {
    return {textOf(object, node), besideScene(textOf(object, "cache"), scene), lengthIn(object, "meanMm"),
            lengthIn(object, "largestMm")};
}

TargetFacts targetIn(const JsonValue& answer) {
    const std::string scene = textOf(answer, "scene");
    TargetFacts facts{cacheIn(answer, "target", scene), {}};
    if (answer.HasMember("skin"))
        facts.skin = cacheIn(answer["skin"], "node", scene);
    return facts;
}

FrameSpan framesIn(const JsonValue& answer) {
    const FrameSpan span{frameOf(answer, "firstFrame"), frameOf(answer, "lastFrame")};
    if (span.last < span.first)
        throw std::runtime_error("lastFrame lies before firstFrame");
    return span;
}

template <class Read>
auto read(const fs::path& file, const Read& reading) -> std::optional<decltype(reading(JsonValue()))> {
    try {
        return reading(storage::readJson(file.string(), storage::jsonRules::ledger));
    } catch (const std::exception&) {
        return {}; // a step that is still to be done, or whose answer was spoiled
    }
}

} // namespace

fs::path answerFile(const std::string& step, const std::string& mesh) {
    return fs::path("answers") / (step + (mesh.empty() ? "" : "-" + mesh) + ".json");
}

std::string ofRound(const std::string& step, std::size_t round) {
    return round == 0 ? step : step + "-" + std::to_string(round);
}

RunFacts readFacts(const fs::path& folder) {
    RunFacts facts;
    facts.character = read(folder / answerFile("import"), characterIn);
    facts.poses = read(folder / answerFile("poses"), framesIn);
    facts.motion = read(folder / answerFile("motion"), framesIn);
    while (const auto span = read(folder / answerFile(ofRound("refine", facts.refined.size() + 1)), framesIn))
        facts.refined.push_back(*span);
    if (!facts.character)
        return facts;
    std::vector<std::string> steps{"motion-target"};
    for (std::size_t round = 0; round <= facts.refined.size(); ++round)
        steps.push_back(ofRound("target", round));
    for (const MeshFacts& mesh : facts.character->meshes)
        for (const std::string& step : steps) {
            const fs::path file = answerFile(step, mesh.name);
            const std::optional<TargetFacts> target = read(folder / file, targetIn);
            if (target)
                facts.targets[file.string()] = *target;
        }
    return facts;
}

} // namespace quarn
