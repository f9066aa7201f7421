// SPDX-License-Identifier: Apache-2.0
// Guards the elements of array attributes while several geometries of one node are evaluated at the same time.
#pragma once

#include "graph/EvaluationLock.h"
#include "graph/Node.h"

#include <atomic>
#include <memory>
#include <mutex>
#include <shared_mutex>
#include <vector>

namespace OpenQuarn {

/// Held while a parallel evaluation runs; without one, the locks below cost a load and a branch.
class ParallelSection {
public:
    ParallelSection() { ++running; }
    ~ParallelSection() { --running; }
    ParallelSection(const ParallelSection&) = delete;
    ParallelSection& operator=(const ParallelSection&) = delete;
    static bool isRunning() { return running.load(std::memory_order_relaxed) > 0; }

private:
    static inline std::atomic<int> running{0};
};

class ArrayReadLock {
public:
    explicit ArrayReadLock(const NodeData* owner) {
        if (owner && ParallelSection::isRunning())
            lock_ = std::shared_lock(owner->arrayMutex);
    }

private:
    std::shared_lock<std::shared_mutex> lock_;
};

class ArrayWriteLock {
public:
    explicit ArrayWriteLock(const NodeData* owner) {
        if (owner && ParallelSection::isRunning())
            lock_ = std::unique_lock(owner->arrayMutex);
    }

private:
    std::unique_lock<std::shared_mutex> lock_;
};

/// Calls visit(slot) for the direct parts that a slot has now; a parallel evaluation may remove elements meanwhile.
template <class Visit>
void forEachPartKept(const Slot& slot, Visit&& visit) {
    if (!ParallelSection::isRunning()) {
        slot.forEachPart(visit);
        return;
    }
    std::vector<std::shared_ptr<Slot>> parts;
    {
        const ArrayReadLock lock(slot.owner);
        slot.forEachPart([&](Slot& part) { parts.push_back(part.shared_from_this()); });
    }
    for (const std::shared_ptr<Slot>& part : parts)
        visit(*part);
}

/// For who adds or removes elements, or walks over them, outside of compute(): the lock of the graph, so that who holds
/// it finds the same elements until it gives it up. Taken before the locks above, never inside of them.
class ParallelGraphLock {
public:
    ParallelGraphLock() {
        if (ParallelSection::isRunning())
            lock_ = std::unique_lock(EvaluationLock::instance());
    }

private:
    std::unique_lock<EvaluationLock> lock_;
};

} // namespace OpenQuarn
