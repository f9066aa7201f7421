// SPDX-License-Identifier: Apache-2.0
// The one host of the process, with the rig nodes and the deformer, and the way into it.
#pragma once

#include "openquarn_app/Scene.h"
#include "openquarn_app/Session.h"
#include "quarn/scene/HostErrors.h"

#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace python {

/// Started with the first scene, ended when the interpreter ends. Thread: one that has the lock.
class Host {
public:
    /// For whoever works in the host; a thread that has it may take it again. Meanwhile the calling thread, which has
    /// the interpreter's lock, gives that up, so that the one inside can get it. Thread: any.
    static std::unique_lock<std::recursive_mutex> lock();
    /// Starts the host when there is none. Throws std::runtime_error, naming the places, when the deformer is not found
    /// or cannot be loaded, and after end().
    static Host& instance();
    /// Ends the host. The scenes have to be closed. Nothing is started again.
    static void end();

    ~Host();
    Host(const Host&) = delete;
    Host& operator=(const Host&) = delete;

    OpenQuarn::Session& session() { return *session_; }
    quarn::HostErrors& errors() { return *errors_; }
    /// Warnings go there until it is set anew; null: nowhere. Returns the one of before.
    std::vector<std::string>* setWarnings(std::vector<std::string>* list);

private:
    Host();

    std::vector<std::string>* warnings_ = nullptr;
    OpenQuarn::MessageSink previousSink_;
    std::unique_ptr<quarn::HostErrors> errors_;
    std::unique_ptr<OpenQuarn::Session> session_;
};

} // namespace python
