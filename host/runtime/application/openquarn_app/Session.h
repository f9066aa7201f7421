// SPDX-License-Identifier: Apache-2.0
// The scene, as an application drives it. Nodes, plugs and values are reached through the H-API (HFnDependencyNode,
// HPlug, HSelectionList); commands, files, plug-ins, messages and further scenes (Scene.h) have headers of their own
// beside this one.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HObject.h"

#include <cstddef>
#include <memory>
#include <vector>

namespace OpenQuarn {

/// An open host with an empty scene. There is one at a time in a process; the thread that makes it is the main one.
/// "The scene" below is the current one: the session's own, unless an application has made another current.
/// Thread: main.
class OPENQUARN_API Session {
public:
    /// Throws std::runtime_error while there is another.
    Session();
    /// Empties the scene, and all others that there still are, then unloads the plug-ins that are still loaded.
    /// Thread: any, while no other is in the host.
    ~Session();
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;

    /// Deletes all nodes but the time node, goes to the first frame, and has no file any more.
    void newScene();
    /// All nodes, in order of creation.
    std::vector<HObject> nodes() const;
    std::size_t nodeCount() const;

    /// The current time in frames, which the node "time1" gives as "outTime".
    double time() const;
    void setTime(double frame);

private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace OpenQuarn
