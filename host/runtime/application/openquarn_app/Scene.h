// SPDX-License-Identifier: Apache-2.0
// Several scenes side by side in one session.
#pragma once

#include "openquarn/HApi.h"

#include <memory>

namespace OpenQuarn {

/// A scene beside the session's own, with nodes, a time and a file of its own. Node types, plug-ins, commands,
/// messages, settings and what an animation does are the session's. Nothing connects two scenes: a plug of another
/// scene is to be left alone until that one is current.
class OPENQUARN_API Scene {
public:
    /// Empty, without a file, and not current. Throws std::runtime_error without a session. Thread: any, while no other
    /// is in the host.
    Scene();
    /// Deletes the nodes; handles of them answer with a failing status from now on. Not while it is current. Thread:
    /// as for the constructor.
    ~Scene();
    Scene(const Scene&) = delete;
    Scene& operator=(const Scene&) = delete;

    /// While it lives, its scene is the current one: the one that the H-API, commands, openScene() and Session mean,
    /// and whose folder relative paths count from; and the calling thread is the main one. They nest, and end in the
    /// reverse order. Costs less than setting a plug.
    ///
    /// So scenes can be used from several threads, one at a time: whoever makes a scene current sees to it that
    /// meanwhile no other thread is in the host.
    class OPENQUARN_API Current {
    public:
        /// `scene` outlives it. Throws std::runtime_error when the session has ended.
        explicit Current(Scene& scene);
        ~Current();
        Current(const Current&) = delete;
        Current& operator=(const Current&) = delete;

    private:
        struct Impl;
        std::unique_ptr<Impl> impl_;
    };

private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace OpenQuarn
