// SPDX-License-Identifier: Apache-2.0
// Scenarios: steps in a scene with one deformer, and what is observed after each.
#include "kinds.h"
#include "scenarioStep.h"
#include "shownMessages.h"
#include "values.h"

#include "openquarn_app/Animation.h"
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
