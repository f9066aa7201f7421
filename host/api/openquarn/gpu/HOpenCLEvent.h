// SPDX-License-Identifier: Apache-2.0
// OpenCL events, and lists of them to wait for.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/gpu/opencl.h"

#include <initializer_list>
#include <utility>
#include <vector>

/// Holds one reference on an OpenCL event, or none; copies hold one each. `[any]` throughout, one object for one thread
/// at a time.
class OPENQUARN_API HOpenCLEvent {
public:
    HOpenCLEvent() noexcept = default;
    /// Takes over the caller's reference. Null is no event.
    explicit HOpenCLEvent(cl_event event) noexcept
        : event_(event) {}
    HOpenCLEvent(const HOpenCLEvent& other) noexcept;
    HOpenCLEvent(HOpenCLEvent&& other) noexcept
        : event_(std::exchange(other.event_, nullptr)) {}
    HOpenCLEvent& operator=(const HOpenCLEvent& other) noexcept;
    HOpenCLEvent& operator=(HOpenCLEvent&& other) noexcept;
    ~HOpenCLEvent();

    bool isNull() const noexcept { return event_ == nullptr; }
    /// Null when there is none. Stays this object's.
    cl_event get() const noexcept { return event_; }
    /// Where a call may put a new event: what it held before is released first.
    cl_event* receive() noexcept;
    void reset() noexcept;

private:
    cl_event event_ = nullptr;
};

/// Events to wait for, each kept until the list goes. `[any]`
class OPENQUARN_API HOpenCLEventList {
public:
    HOpenCLEventList() = default;
    HOpenCLEventList(std::initializer_list<HOpenCLEvent> events);
    /// A null event is left out, and one that is there already. Throws std::bad_alloc in the caller.
    void append(const HOpenCLEvent& event);

    /// In the form that OpenCL's enqueue functions take: a length, and null for an empty list.
    cl_uint length() const noexcept { return static_cast<cl_uint>(raw_.size()); }
    const cl_event* data() const noexcept { return raw_.empty() ? nullptr : raw_.data(); }

private:
    std::vector<HOpenCLEvent> events_;
    std::vector<cl_event> raw_;
};
