// SPDX-License-Identifier: Apache-2.0
// The thread tags of the API: which calls a thread may make at the moment.
#pragma once

#include "openquarn/HStatus.h"

#include <atomic>
#include <utility>

namespace OpenQuarn {

enum class ThreadTag : unsigned char {
    any,
    main, ///< the main thread, outside of an evaluation
    eval, ///< the main thread, or a thread inside an evaluation
};

/// A function of the host as its callers know it, and where they may call it.
struct HostCall {
    const char* name;
    ThreadTag tag;
};

/// What a thread does for the host.
enum class ThreadWork : unsigned char {
    none,
    evaluation,
    waiting, ///< for a parallel evaluation: what runs on it meanwhile is a piece of some plug-in's own loop
};

namespace detail {
// the library is loaded with the program, or by it: a byte of the room that the loader keeps for this is not missed
extern constinit thread_local ThreadWork work __attribute__((tls_model("initial-exec")));
// that of the main thread; each thread's lies at another address
extern std::atomic<const ThreadWork*> mainWork;
} // namespace detail

/// Makes the calling thread the main one.
void setMainThread();

/// Makes the calling thread the main one for as long as this lives.
class MainThreadScope {
public:
    MainThreadScope() noexcept
        : previous_(detail::mainWork.exchange(&detail::work)) {}
    ~MainThreadScope() { detail::mainWork = previous_; }
    MainThreadScope(const MainThreadScope&) = delete;
    MainThreadScope& operator=(const MainThreadScope&) = delete;

private:
    const ThreadWork* previous_;
};

inline bool isMainThread() noexcept {
    return detail::mainWork.load(std::memory_order_relaxed) == &detail::work;
}

/// Whether the calling thread may make a call with that tag.
inline bool mayCall(ThreadTag tag) noexcept {
    if (tag == ThreadTag::any)
        return true;
    if (detail::work == ThreadWork::none)
        return isMainThread();
    return tag == ThreadTag::eval && detail::work == ThreadWork::evaluation;
}

/// What the calling thread does, for as long as this lives.
class WorkScope {
public:
    explicit WorkScope(ThreadWork work) noexcept
        : previous_(std::exchange(detail::work, work)) {}
    ~WorkScope() { detail::work = previous_; }
    WorkScope(const WorkScope&) = delete;
    WorkScope& operator=(const WorkScope&) = delete;

private:
    ThreadWork previous_;
};

// A call that its thread may not make is not carried out: its answer is a sentence that names function and rule. A
// debug build ends with it instead.

/// Of a call that the thread may not make: kFailure with the sentence.
HStatus misuse(const HostCall& call) noexcept;

/// Success when the thread may make the call.
inline HStatus threadStatus(const HostCall& call) noexcept {
    return mayCall(call.tag) ? HStatus() : misuse(call);
}

/// For a function that throws: std::runtime_error with the sentence when the thread may not make the call.
void requireThread(const HostCall& call);

/// Shows the sentence as an error, once for each function and session.
void showMisuse(const HostCall& call) noexcept;

/// For a function that has no way to say so: true when the thread may not make the call, which the user is told. It
/// then gives what it gives for a null object.
inline bool isRefused(const HostCall& call) noexcept {
    if (mayCall(call.tag))
        return false;
    showMisuse(call);
    return true;
}

} // namespace OpenQuarn
