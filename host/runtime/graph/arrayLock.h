// SPDX-License-Identifier: Apache-2.0
// Guards the elements of array attributes while several geometries of one node are evaluated at the same time.
#pragma once

#include "graph/Node.h"

#include <mutex>
#include <shared_mutex>

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

} // namespace OpenQuarn
