// SPDX-License-Identifier: Apache-2.0
#include "python/scene/Host.h"

#include "openquarn_app/Plugins.h"
#include "rig/registration.h"

#include <pybind11/pybind11.h>

#include <cstdlib>
#include <filesystem>
#include <memory>
#include <stdexcept>
#include <utility>

#include <dlfcn.h>

namespace python {
namespace {

namespace fs = std::filesystem;

enum class State { notStarted, running, ended };
State state = State::notStarted;
Host* host = nullptr; // not destroyed by the end of the process, when what it needs may have gone

// decision 0198: in a build folder and in a package the plug-in lies beside this module
fs::path besideThisModule() {
    Dl_info module{};
    if (dladdr(reinterpret_cast<const void*>(&besideThisModule), &module) == 0 || module.dli_fname == nullptr)
        return "neuralWarp.so";
    return fs::path(module.dli_fname).replace_filename("neuralWarp.so");
}

fs::path deformerPlugin() {
    const char* given = std::getenv("NEURALWARP_PLUGIN");
    const bool isGiven = given != nullptr && *given != '\0';
    fs::path path = isGiven ? fs::path(given) : besideThisModule();
    std::error_code error;
    if (!fs::exists(path, error))
        throw std::runtime_error("the plug-in neuralWarp.so was not found; looked at: " + path.string() +
                                 (isGiven ? " (NEURALWARP_PLUGIN)" : ". Set NEURALWARP_PLUGIN to its path"));
    return path;
}

} // namespace

std::unique_lock<std::recursive_mutex> Host::lock() {
    static auto& theMutex = *new std::recursive_mutex; // other threads may come while the process ends
    std::unique_lock lock(theMutex, std::try_to_lock);
    if (!lock.owns_lock()) {
        const pybind11::gil_scoped_release released;
        lock.lock();
    }
    return lock;
}

Host& Host::instance() {
    if (state == State::ended)
        throw std::runtime_error("the interpreter ends: no scene can be opened any more");
    if (!host) {
        host = new Host;
        state = State::running;
    }
    return *host;
}

void Host::end() {
    state = State::ended;
    delete std::exchange(host, nullptr);
}

Host::Host() {
    const fs::path plugin = deformerPlugin();
    previousSink_ = OpenQuarn::setMessageSink([this](const OpenQuarn::Message& message) {
        if (warnings_ != nullptr && message.severity == OpenQuarn::Severity::warning)
            warnings_->push_back(message.text);
    });
    try {
        errors_ = std::make_unique<quarn::HostErrors>();
        session_ = std::make_unique<OpenQuarn::Session>();
        OpenQuarn::addPlugin("quarnRig", rig::registerNodes, rig::deregisterNodes);
        OpenQuarn::loadPlugin(plugin.string());
    } catch (...) {
        session_.reset();
        errors_.reset();
        OpenQuarn::setMessageSink(std::move(previousSink_));
        throw;
    }
}

Host::~Host() {
    session_.reset();
    errors_.reset();
    OpenQuarn::setMessageSink(std::move(previousSink_));
}

std::vector<std::string>* Host::setWarnings(std::vector<std::string>* list) {
    return std::exchange(warnings_, list);
}

} // namespace python
