// SPDX-License-Identifier: Apache-2.0
// Who evaluates what, while several threads evaluate.
#pragma once

#include <condition_variable>
#include <map>
#include <mutex>
#include <thread>
#include <utility>

namespace OpenQuarn {

class Node;
class NodeData;

/// The lock of the graph: held, to any depth, while a thread walks the graph and computes; given up while it is inside
/// a deformer (OutsideOfGraph). Beside it stands who computes which part of which node.
class EvaluationLock {
public:
    /// A node's data, and the geometry of it: -1 for a node that is computed as a whole.
    using Part = std::pair<const NodeData*, long long>;

    static EvaluationLock& instance();

    void lock();
    void unlock();
    /// Gives the lock up whatever the depth, which is returned; retake() takes it again to that depth.
    int release();
    void retake(int depth);

    /// Waits, with the lock held on entry and on return, until no other thread computes the part, and takes it. When
    /// the other one is itself waiting, directly or not, for this thread, it is suspended until this thread is done:
    /// the part is then shared, in the way of a nested call on one thread.
    void claim(const Part& part);
    void disclaim(const Part& part);

private:
    bool waitsForThisThread(std::thread::id thread) const;

    std::mutex mutex_;
    std::condition_variable changed_;
    std::thread::id owner_;
    int depth_ = 0;
    struct Claim {
        std::thread::id thread;
        int times = 0;
    };
    std::map<Part, Claim> claims_;
    std::map<std::thread::id, Part> waiting_;
};

} // namespace OpenQuarn
