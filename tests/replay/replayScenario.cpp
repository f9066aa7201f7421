// SPDX-License-Identifier: Apache-2.0
// Scenarios: steps in a scene with one deformer, and what is observed after each. README.md lists the steps.
#include "ScenarioObservation.h"
#include "ScenarioScene.h"
#include "kinds.h"
#include "shownMessages.h"
#include "values.h"

#include "openquarn_app/Animation.h"
#include "openquarn_app/Commands.h"
#include "support/StdoutCapture.h"

#include <stdexcept>

namespace replay {
namespace {

// What one step did.
struct StepResult {
    Json values; // the members of the expected entry but messages and stdout
    std::vector<OpenQuarn::Message> messages;
    std::vector<std::string> printed; // lines
};

unsigned indexOf(Input& step) {
    const Json* index = step.find("index");
    return index ? static_cast<unsigned>(readCount(*index)) : 0;
}

// null when the command has no result
Json resultToJson(const HCommandResult& result, const ScenarioScene& scene, JsonAllocator& allocator) {
    HString text;
    HDoubleArray numbers;
    if (result.resultType() == HCommandResult::kInvalid)
        return {};
    if (result.resultType() == HCommandResult::kString && !result.getResult(text).error())
        return toJson(scene.withoutRoot(text.asStdString()), allocator);
    if (result.getResult(numbers).error())
        throw std::runtime_error("the command gave a result of kind " + std::to_string(result.resultType()));
    return toJson(std::vector<double>(numbers.begin(), numbers.end()), allocator);
}

void deform(Input& step, ScenarioScene& scene, Output& out, JsonAllocator& allocator) {
    const unsigned index = indexOf(step);
    out.set("status", Json(observedStatus(scene.deform(index))));
    observeGeometry(out, scene, index, allocator);
}

// the words of the command for a step, its indices left out
std::string commandWords(const std::string& op, Input& step) {
    if (op == "vertexDeltas")
        return "-vertexDeltas " + OpenQuarn::quotedWord(readText(step["value"]));
    if (op == "export")
        return std::string("-exportActive ") + (readBool(step["value"]) ? "true" : "false");
    if (op == "reload")
        return "-reloadModel";
    if (op == "dumpInfo")
        return "-dumpInfo";
    throw std::runtime_error("the step \"" + op + "\" is not known");
}

void runCommand(const std::string& op, Input& step, ScenarioScene& scene, Output& out, JsonAllocator& allocator) {
    HCommandResult result;
    const HStatus status = scene.runCommand(commandWords(op, step), step.find("indices"), result);
    if (op != "dumpInfo")
        out.set("status", Json(observedStatus(status)));
    if (op == "dumpInfo" || op == "vertexDeltas")
        out.set("result", resultToJson(result, scene, allocator));
}

Json runStep(Input& step, ScenarioScene& scene, JsonAllocator& allocator) {
    Output out(allocator);
    const std::string op = readText(step["op"]);
    if (op == "set")
        scene.set(readText(step["name"]), step["value"]);
    else if (op == "setElement")
        scene.setElement(readText(step["name"]), indexOf(step), step["value"]);
    else if (op == "deform")
        deform(step, scene, out, allocator);
    else
        runCommand(op, step, scene, out, allocator);
    for (const std::string& key : step.unread())
        throw std::runtime_error("nothing reads \"" + key + "\" of the step \"" + op + '"');
    return out.take();
}

void replaceRoot(StepResult& result, const ScenarioScene& scene) {
    for (OpenQuarn::Message& message : result.messages)
        message.text = scene.withoutRoot(message.text);
    for (std::string& line : result.printed)
        line = scene.withoutRoot(line);
}

std::vector<StepResult> runSteps(Input& input, bool isPlaying, JsonAllocator& allocator) {
    MessageCapture shown;
    ScenarioScene scene(input);
    OpenQuarn::Animation::setPlaying(isPlaying);
    std::vector<StepResult> results;
    for (const Json& members : input["steps"].GetArray()) {
        Input step(members);
        StepResult result;
        StdoutCapture capture;
        result.values = runStep(step, scene, allocator);
        result.printed = linesOf(capture.take());
        result.messages = shown.take();
        replaceRoot(result, scene);
        results.push_back(std::move(result));
    }
    scene.close();
    if (const auto late = shown.take(); !late.empty())
        throw std::runtime_error("shown when the scene was closed: " + late[0].text);
    return results;
}

} // namespace

Json replayScenario(Input& input, JsonAllocator& allocator) {
    std::vector<StepResult> steps = runSteps(input, false, allocator);
    const std::vector<StepResult> whilePlaying = runSteps(input, true, allocator);
    Json entries(rapidjson::kArrayType);
    for (std::size_t i = 0; i < steps.size(); ++i) {
        Json& entry = steps[i].values;
        entry.AddMember("messages", toJson(describe(steps[i].messages, whilePlaying[i].messages), allocator),
                        allocator);
        entry.AddMember("stdout", toJson(steps[i].printed, allocator), allocator);
        entries.PushBack(entry, allocator);
    }
    return entries;
}

} // namespace replay
