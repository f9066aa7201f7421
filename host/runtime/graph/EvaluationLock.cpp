// SPDX-License-Identifier: Apache-2.0
#include "graph/EvaluationLock.h"

namespace OpenQuarn {

EvaluationLock& EvaluationLock::instance() {
    static EvaluationLock lock;
    return lock;
}

void EvaluationLock::lock() {
    retake(1);
}

void EvaluationLock::retake(int depth) {
    std::unique_lock guard(mutex_);
    const std::thread::id self = std::this_thread::get_id();
    if (owner_ != self) {
        changed_.wait(guard, [&] { return depth_ == 0; });
        owner_ = self;
    }
    depth_ += depth;
}

void EvaluationLock::unlock() {
    const std::scoped_lock guard(mutex_);
    if (--depth_ > 0)
        return;
    owner_ = {};
    changed_.notify_all();
}

int EvaluationLock::release() {
    const std::scoped_lock guard(mutex_);
    const int depth = depth_;
    depth_ = 0;
    owner_ = {};
    changed_.notify_all();
    return depth;
}

// follows who waits for whom; a thread waits for one part at a time, and a part has one thread (decision 0032)
bool EvaluationLock::waitsForThisThread(std::thread::id thread) const {
    while (thread != std::this_thread::get_id()) {
        const auto wanted = waiting_.find(thread);
        if (wanted == waiting_.end())
            return false;
        const auto claim = claims_.find(wanted->second);
        if (claim == claims_.end())
            return false;
        thread = claim->second.thread;
    }
    return true;
}

void EvaluationLock::claim(const Part& part) {
    std::unique_lock guard(mutex_);
    const std::thread::id self = std::this_thread::get_id();
    for (auto claim = claims_.find(part); claim != claims_.end(); claim = claims_.find(part)) {
        if (waitsForThisThread(claim->second.thread))
            break;
        waiting_[self] = part;
        const int depth = depth_;
        depth_ = 0;
        owner_ = {};
        changed_.notify_all();
        changed_.wait(guard, [&] {
            const auto now = claims_.find(part);
            return depth_ == 0 && (now == claims_.end() || waitsForThisThread(now->second.thread));
        });
        owner_ = self;
        depth_ = depth;
        waiting_.erase(self);
    }
    Claim& mine = claims_[part];
    if (mine.times++ == 0)
        mine.thread = self;
}

void EvaluationLock::disclaim(const Part& part) {
    const std::scoped_lock guard(mutex_);
    const auto claim = claims_.find(part);
    if (--claim->second.times > 0)
        return;
    claims_.erase(claim);
    changed_.notify_all();
}

} // namespace OpenQuarn
