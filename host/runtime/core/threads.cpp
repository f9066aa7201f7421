// SPDX-License-Identifier: Apache-2.0
#include "core/threads.h"

#include "openquarn/HString.h"
#include "openquarn_app/Messages.h"

#include <cstdio>
#include <cstdlib>
#include <mutex>
#include <set>
#include <stdexcept>
#include <string>

namespace OpenQuarn {

constinit thread_local ThreadWork detail::work = ThreadWork::none;
std::atomic<const ThreadWork*> detail::mainWork{&detail::work};

namespace {

const char* brokenRule(ThreadTag tag) noexcept {
    if (tag == ThreadTag::eval)
        return "on a thread that evaluates nothing";
    return isMainThread() ? "during an evaluation" : "on another thread than the main one";
}

std::string sentence(const HostCall& call) {
    return std::string(call.name) + " was called " + brokenRule(call.tag);
}

void endDebugBuild([[maybe_unused]] const HostCall& call) noexcept {
#ifndef NDEBUG
    std::fprintf(stderr, "OpenQuarn: %s was called %s\n", call.name, brokenRule(call.tag));
    std::abort();
#endif
}

std::mutex saidMutex;
std::set<std::string> said; // functions that an error has named

bool isNewToTheUser(const char* function) {
    const std::scoped_lock lock(saidMutex);
    return said.insert(function).second;
}

} // namespace

void setMainThread() {
    detail::mainWork = &detail::work;
    const std::scoped_lock lock(saidMutex);
    said.clear();
}

HStatus misuse(const HostCall& call) noexcept {
    endDebugBuild(call);
    try {
        return {HStatus::kFailure, sentence(call)};
    } catch (...) {
        return HStatus::kFailure;
    }
}

void requireThread(const HostCall& call) {
    if (const HStatus refused = threadStatus(call); refused.error())
        throw std::runtime_error(refused.errorString().asStdString());
}

void showMisuse(const HostCall& call) noexcept {
    endDebugBuild(call);
    try {
        if (isNewToTheUser(call.name))
            showMessage(Severity::error, sentence(call));
    } catch (...) {
        showMessage(Severity::error, "a function of the host was called on a thread that may not call it");
    }
}

} // namespace OpenQuarn
