// SPDX-License-Identifier: Apache-2.0
#include "gpu/activity.h"

#include "gpu/Device.h"
#include "gpu/failure.h"
#include "openquarn/gpu/HOpenCLEvent.h"

#include <algorithm>
#include <functional>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

namespace OpenQuarn {
namespace {

template <class T>
using ByName = std::map<std::string, T, std::less<>>;

struct Timed {
    std::string name;
    HOpenCLEvent event;
};

struct Activity {
    std::mutex mutex;
    GpuCounts plain; // all that has no name
    ByName<std::uint64_t> launches;
    ByName<std::uint64_t> uploads;
    ByName<double> seconds;
    ByName<double> hostSeconds;
    std::vector<Timed> pending;
};

// never destroyed, as the device is not
Activity& activity() {
    static Activity& theActivity = *new Activity;
    return theActivity;
}

template <class T>
void add(ByName<T>& values, std::string_view name, T value) {
    const auto found = values.find(name);
    if (found == values.end())
        values.emplace(name, value);
    else
        found->second += value;
}

// True when nothing more is to be learned of the command; it has not run yet otherwise.
bool measure(const Timed& timed, ByName<double>& seconds) {
    cl_int state = CL_COMPLETE;
    if (noteFailure(clGetEventInfo(timed.event.get(), CL_EVENT_COMMAND_EXECUTION_STATUS, sizeof state, &state, nullptr),
                    "clGetEventInfo") != CL_SUCCESS)
        return true;
    if (state != CL_COMPLETE)
        return state < 0; // has failed
    cl_ulong start = 0;
    cl_ulong end = 0;
    const auto ask = [&](cl_profiling_info what, cl_ulong& time) {
        return noteFailure(clGetEventProfilingInfo(timed.event.get(), what, sizeof time, &time, nullptr),
                           "clGetEventProfilingInfo");
    };
    if (ask(CL_PROFILING_COMMAND_START, start) == CL_SUCCESS && ask(CL_PROFILING_COMMAND_END, end) == CL_SUCCESS)
        add(seconds, timed.name, static_cast<double>(end - start) * 1e-9);
    return true;
}

void measureAll(Activity& all) {
    const auto isMeasured = [&](const Timed& timed) { return measure(timed, all.seconds); };
    all.pending.erase(std::remove_if(all.pending.begin(), all.pending.end(), isMeasured), all.pending.end());
}

} // namespace

void countLaunch(std::string_view kernel) {
    const std::scoped_lock lock(activity().mutex);
    add(activity().launches, kernel, std::uint64_t{1});
}

void countUpload(std::string_view name, std::size_t bytes) {
    const std::scoped_lock lock(activity().mutex);
    add(activity().uploads, name, std::uint64_t{1});
    activity().plain.bytesUp += bytes;
}

void countDownload(std::size_t bytes) {
    const std::scoped_lock lock(activity().mutex);
    ++activity().plain.downloads;
    activity().plain.bytesDown += bytes;
}

void countEvaluation(bool onGpu, bool isFallback) {
    const std::scoped_lock lock(activity().mutex);
    GpuCounts& counts = activity().plain;
    ++(onGpu ? counts.gpuEvaluations : counts.cpuEvaluations);
    counts.fallbacks += isFallback ? 1 : 0;
}

void timeCommand(const Device& device, std::string_view name, cl_event event) {
    constexpr std::size_t manyPending = 1024;
    if (!device.isTimed || !event)
        return;
    if (noteFailure(clRetainEvent(event), "clRetainEvent") != CL_SUCCESS)
        return;
    HOpenCLEvent kept(event);
    const std::scoped_lock lock(activity().mutex);
    if (activity().pending.size() >= manyPending)
        measureAll(activity());
    activity().pending.push_back({std::string(name), std::move(kept)});
}

void timesMeasured() {
    const std::scoped_lock lock(activity().mutex);
    measureAll(activity());
}

TimedStep::TimedStep(const Device& device, std::string_view name) {
    if (!device.isTimed)
        return;
    name_ = name;
    start_ = std::chrono::steady_clock::now();
}

TimedStep::~TimedStep() {
    if (name_.empty())
        return;
    const std::chrono::duration<double> spent = std::chrono::steady_clock::now() - start_;
    const std::scoped_lock lock(activity().mutex);
    add(activity().hostSeconds, name_, spent.count());
}

GpuCounts Gpu::counts() {
    const std::scoped_lock lock(activity().mutex);
    Activity& all = activity();
    measureAll(all);
    GpuCounts counts = all.plain;
    counts.launches.insert(all.launches.begin(), all.launches.end());
    counts.uploads.insert(all.uploads.begin(), all.uploads.end());
    counts.seconds.insert(all.seconds.begin(), all.seconds.end());
    counts.hostSeconds.insert(all.hostSeconds.begin(), all.hostSeconds.end());
    return counts;
}

void Gpu::resetCounts() {
    const std::scoped_lock lock(activity().mutex);
    Activity& all = activity();
    measureAll(all);
    all.plain = {};
    all.launches.clear();
    all.uploads.clear();
    all.seconds.clear();
    all.hostSeconds.clear();
}

} // namespace OpenQuarn
