// SPDX-License-Identifier: Apache-2.0
#include "core/Operations.h"

#include "core/apiCall.h"
#include "openquarn_app/Faults.h"

#include <array>
#include <mutex>
#include <stdexcept>

namespace OpenQuarn {
namespace {

constexpr auto pointCount = static_cast<std::size_t>(Operation::faultPoints);

struct Plan {
    long long callsBefore = 0; // calls that still pass
    long long failures = 0;    // calls that fail after them
    bool fired = false;
};

std::mutex planMutex;
std::array<Plan, pointCount> plans;

std::size_t pointNumber(std::string_view name) {
    for (std::size_t i = 0; i < pointCount; ++i)
        if (name == detail::operations[i].name)
            return i;
    throw std::invalid_argument("no operation named '" + std::string(name) + "' can be made to fail");
}

} // namespace

std::atomic<bool> detail::faultsArmed{false};

bool detail::countFault(Operation point) noexcept {
    const std::scoped_lock lock(planMutex);
    Plan& plan = plans[static_cast<std::size_t>(point)];
    if (plan.failures == 0)
        return false;
    if (plan.callsBefore > 0) {
        --plan.callsBefore;
        return false;
    }
    --plan.failures;
    plan.fired = true;
    return true;
}

HStatus faultStatus(Operation point) noexcept {
    try {
        return {HStatus::kFailure, std::string(operationName(point)) + ": failed on demand"};
    } catch (...) {
        return HStatus::kFailure;
    }
}

HStatus statusOfException(const char* operation) noexcept {
    try {
        throw;
    } catch (const std::bad_alloc&) {
        return {HStatus::kInsufficientMemory, std::string(operation) + ": out of memory"};
    } catch (const std::exception& error) {
        return {HStatus::kFailure, std::string(operation) + ": " + error.what()};
    } catch (...) {
        return {HStatus::kFailure, std::string(operation) + ": an exception of an unknown type"};
    }
}

std::vector<std::string> Faults::operations() {
    std::vector<std::string> names;
    names.reserve(pointCount);
    for (std::size_t i = 0; i < pointCount; ++i)
        names.emplace_back(detail::operations[i].name);
    return names;
}

void Faults::fail(std::string_view operation, int call, int times) {
    if (call < 1 || times < 1)
        throw std::invalid_argument("a fault needs a call and a number of times of 1 or more");
    const std::size_t point = pointNumber(operation);
    const std::scoped_lock lock(planMutex);
    plans[point].callsBefore = call - 1;
    plans[point].failures = times;
    detail::faultsArmed = true;
}

void Faults::clear() {
    const std::scoped_lock lock(planMutex);
    for (Plan& plan : plans)
        plan = {};
    detail::faultsArmed = false;
}

bool Faults::fired(std::string_view operation) {
    const std::size_t point = pointNumber(operation);
    const std::scoped_lock lock(planMutex);
    return plans[point].fired;
}

} // namespace OpenQuarn
