// SPDX-License-Identifier: Apache-2.0
// Pull evaluation: bringing a value up to date when it is asked for.
#pragma once

#include "graph/Slot.h"
#include "openquarn/HStatus.h"

#include <utility>

namespace OpenQuarn {

/// Brings the slot, and everything below it, up to date: takes values along connections and runs compute() where it has
/// to. A slot that is clean is left alone. Answers with the status of the slot's own compute(): what fails further up
/// is reported there, and the evaluation goes on with the last values.
///
/// Thread: main, or any thread inside a parallel evaluation. A node's compute() runs on one thread at a time, the
/// geometries of a filter each on one: whoever needs a value that another thread is computing waits for it.
HStatus pull(const std::shared_ptr<Slot>& slot);

/// Takes the part of the node that a slot belongs to, for as long as it is computed; the last one taken goes first.
/// Thread: one that holds the lock of the graph.
class ComputeClaim {
public:
    explicit ComputeClaim(const Slot& slot);
    ~ComputeClaim();
    ComputeClaim(const ComputeClaim&) = delete;
    ComputeClaim& operator=(const ComputeClaim&) = delete;

private:
    std::pair<const NodeData*, long long> part_;
};

/// Lets other threads evaluate while this one works inside a plug-in's function that needs no graph of its own.
class OutsideOfGraph {
public:
    OutsideOfGraph();
    ~OutsideOfGraph();
    OutsideOfGraph(const OutsideOfGraph&) = delete;
    OutsideOfGraph& operator=(const OutsideOfGraph&) = delete;

private:
    int depth_;
};

} // namespace OpenQuarn
