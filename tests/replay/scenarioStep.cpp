// SPDX-License-Identifier: Apache-2.0
#include "scenarioStep.h"

#include "ScenarioObservation.h"
#include "values.h"

#include "openquarn_app/Commands.h"

#include <stdexcept>

namespace replay {
namespace {

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

} // namespace

unsigned indexOf(Input& step) {
    const Json* index = step.find("index");
    return index ? static_cast<unsigned>(readCount(*index)) : 0;
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

} // namespace replay
