// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Usage.h"

#include "openquarn/Instrumenter.h"

#include <algorithm>
#include <mutex>
#include <utility>

namespace OpenQuarn {
namespace {

struct Counts {
    std::mutex mutex;
    std::vector<UsageEvent> events; // kinds of events are few
};

Counts& counts() {
    static Counts theCounts;
    return theCounts;
}

void countEvent(const std::string& name) {
    const std::scoped_lock lock(counts().mutex);
    auto& events = counts().events;
    const auto found =
        std::find_if(events.begin(), events.end(), [&](const UsageEvent& event) { return event.name == name; });
    if (found != events.end())
        ++found->count;
    else
        events.push_back({name, 1});
}

} // namespace

std::vector<UsageEvent> Usage::events() {
    const std::scoped_lock lock(counts().mutex);
    return counts().events;
}

void Usage::clear() noexcept {
    const std::scoped_lock lock(counts().mutex);
    counts().events.clear();
}

} // namespace OpenQuarn

Instrumenter::Instrumenter(Tstring eventName) noexcept
    : eventName_(std::move(eventName)) {}

Instrumenter Instrumenter::with(const Tstring& eventName) {
    return Instrumenter(eventName);
}

void Instrumenter::instrument() const noexcept {
    if (eventName_.isEmpty())
        return;
    try {
        OpenQuarn::countEvent(eventName_.asStdString());
    } catch (...) {
        return; // no memory for a new name: a count less changes no result
    }
}
