// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HOpenCLEvent.h"

#include "gpu/failure.h"

#include <algorithm>

namespace {

// null when there is none, or when it could not be retained
cl_event retained(cl_event event) noexcept {
    if (event && OpenQuarn::noteFailure(clRetainEvent(event), "clRetainEvent") != CL_SUCCESS)
        return nullptr;
    return event;
}

} // namespace

HOpenCLEvent::HOpenCLEvent(const HOpenCLEvent& other) noexcept
    : event_(retained(other.event_)) {}

HOpenCLEvent& HOpenCLEvent::operator=(const HOpenCLEvent& other) noexcept {
    if (this != &other)
        *this = HOpenCLEvent(other);
    return *this;
}

HOpenCLEvent& HOpenCLEvent::operator=(HOpenCLEvent&& other) noexcept {
    if (this != &other) {
        reset();
        event_ = std::exchange(other.event_, nullptr);
    }
    return *this;
}

HOpenCLEvent::~HOpenCLEvent() {
    reset();
}

cl_event* HOpenCLEvent::receive() noexcept {
    reset();
    return &event_;
}

void HOpenCLEvent::reset() noexcept {
    if (event_)
        OpenQuarn::noteFailure(clReleaseEvent(event_), "clReleaseEvent");
    event_ = nullptr;
}

HOpenCLEventList::HOpenCLEventList(std::initializer_list<HOpenCLEvent> events) {
    events_.reserve(events.size());
    raw_.reserve(events.size());
    for (const HOpenCLEvent& event : events)
        append(event);
}

void HOpenCLEventList::append(const HOpenCLEvent& event) {
    if (event.isNull() || std::find(raw_.begin(), raw_.end(), event.get()) != raw_.end())
        return;
    raw_.reserve(raw_.size() + 1); // so that nothing throws once the event is in the first list
    events_.push_back(event);
    if (events_.back().isNull()) // could not be retained, which is noted
        events_.pop_back();
    else
        raw_.push_back(event.get());
}
