// SPDX-License-Identifier: Apache-2.0
#include "replayOnDevice.h"

#include "ScenarioObservation.h"
#include "scenarioStep.h"
#include "shownMessages.h"
#include "values.h"

#include "openquarn_app/Gpu.h"
#include "support/PipelineOn.h"
#include "support/StdoutCapture.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace replay {
namespace {

using OpenQuarn::Gpu;

// from here on, the device shows the target alone a little earlier than the CPU
constexpr double nearlyAll = 1e-3;

std::size_t deltaMode(const Json& expected) {
    return readCount(expected["activeSettings"][1]);
}

// Whether the device fails for a geometry in this state: its frames are to be computed, and no vertex has any.
bool mayRefuse(const Json& expected) {
    const Json& buffers = expected["buffers"];
    return deltaMode(expected) == 1 && (buffers["FramesIndexer"].Empty() || buffers["FramesPairs"].Empty());
}

// The device failed where it may, or it was not asked, since the CPU goes on with loads in this frame.
bool isTheCpus(const Json& expected, const OpenQuarn::GpuCounts& counts, bool isDue) {
    const bool isRight = isDue ? counts.fallbacks == 0 : counts.fallbacks == 1 && mayRefuse(expected);
    return counts.cpuEvaluations == 1 && isRight;
}

// A delta mode that is neither Offset nor Surface leaves a model's positions at the origin on the CPU, and is Offset on
// the device.
bool isOtherwiseOnDevice(const Json& expected) {
    return deltaMode(expected) > 1 && readBool(expected["flags"]["modelApplied"]);
}

class DeviceReplay {
public:
    DeviceReplay(Input& input, DeviceTally& tally)
        : scene_(input)
        , tally_(tally) {}

    void run(const Json& steps, const Json& expected) {
        if (!steps.IsArray() || !expected.IsArray() || steps.Size() != expected.Size())
            throw std::runtime_error("there is not an expected result for each step");
        for (rapidjson::SizeType i = 0; i < steps.Size(); ++i)
            doStep(steps[i], expected[i], '[' + std::to_string(i) + ']');
        scene_.close();
    }

    std::vector<Disagreement> found;

private:
    void doStep(const Json& members, const Json& expected, const std::string& where) {
        Input step(members);
        const StdoutCapture printed; // the other replay looks at that, and at the messages
        runStep(step, scene_, results_.GetAllocator());
        shown_.take();
        if (readText(step["op"]) != "deform")
            return;
        const unsigned index = indexOf(step);
        const neuralWarp::neuralWarpData& state = *scene_.rig().state(index);
        const bool isDue = !state.exportMode && state.hasNewLoads();
        // where there is a directory, what was left is loaded in the next frame, which is then another one
        const bool isComparable = readCount(expected["status"]) == 0 && !isOtherwiseOnDevice(expected) &&
                                  std::abs(scene_.morphWeight() - 1.0) >= nearlyAll &&
                                  !(isDue && !state.modelDirectory.empty());
        if (isComparable)
            deformOnDevice(index, expected, isDue, where);
        else
            ++tally_.leftOut;
    }

    void deformOnDevice(unsigned index, const Json& expected, bool isDue, const std::string& where) {
        Gpu::resetCounts();
        const HStatus status = scene_.deformNextFrame(index);
        const OpenQuarn::GpuCounts counts = Gpu::counts();
        const bool isOnDevice = counts.gpuEvaluations == 1 && counts.cpuEvaluations == 0;
        if (status.error() || !(isOnDevice || isTheCpus(expected, counts, isDue)))
            return found.push_back({where, "(an evaluation on the device)", whyNot(status)});
        if (isOnDevice)
            countOnDevice(counts);
        else
            ++tally_.onCpu;
        comparePositions(expected["positions"], index, where);
    }

    void countOnDevice(const OpenQuarn::GpuCounts& counts) {
        tally_.device = Gpu::currentDevice().value().name;
        ++tally_.compared;
        tally_.passedThrough += counts.launches.empty() ? 1U : 0U;
    }

    void comparePositions(const Json& expected, unsigned index, const std::string& where) {
        const Json positions = observePositions(scene_, index, results_.GetAllocator());
        for (Disagreement& one : compare(expected, positions, onDeviceTolerance)) {
            one.where.insert(0, where + ".positions");
            found.push_back(std::move(one));
        }
    }

    std::string whyNot(const HStatus& status) {
        std::string reasons = status.error() ? status.errorString().asStdString() : "on the CPU";
        for (const OpenQuarn::Message& message : shown_.take())
            reasons += "; " + message.text;
        return reasons;
    }

    MessageCapture shown_;
    ScenarioScene scene_;
    DeviceTally& tally_;
    rapidjson::Document results_;
};

} // namespace

bool chooseDevice(const std::string& choice) {
    Gpu::chooseDevice(choice);
    return !Gpu::devices().empty();
}

std::vector<Disagreement> replayOnDevice(const Case& testCase, DeviceTally& tally) {
    const PipelineOn pipeline;
    Input input(testCase.input(), testCase.folder);
    try {
        DeviceReplay replay(input, tally);
        replay.run(input["steps"], testCase.expected());
        return std::move(replay.found);
    } catch (const std::exception& error) {
        return {{"(exception)", "none", error.what()}};
    }
}

} // namespace replay
