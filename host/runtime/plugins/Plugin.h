// SPDX-License-Identifier: Apache-2.0
// A plug-in and what it has registered.
#pragma once

#include "core/Object.h"
#include "openquarn/HPxData.h"
#include "openquarn/HPxNode.h"
#include "openquarn/HStatus.h"
#include "openquarn/HString.h"
#include "openquarn/HTypeId.h"

#include <string>
#include <vector>

class HGPUDeformerRegistrationInfo;
class HPxCommand;
class HSyntax;

namespace OpenQuarn {

/// One thing that a plug-in has registered.
struct Registration {
    enum class Kind { node, data, command, gpuDeformer };
    Kind kind;
    std::string name;
    HTypeId id; ///< of nodes and data

    bool operator==(const Registration& other) const {
        return kind == other.kind && name == other.name && id == other.id;
    }
};

/// "node type 'x'"
std::string describe(const Registration& registration);
/// The same of several: "node type 'x', command 'y'".
std::string describe(const std::vector<Registration>& registrations);
/// Who uses it, as "2 nodes of type 'x', such as 'x1'"; empty when nobody does.
std::string usersOf(const Registration& registration);

/// Thread: main. What can fail throws std::invalid_argument or std::runtime_error with a sentence.
class Plugin final : public Object {
public:
    Plugin(std::string pluginName, std::string pluginPath, std::string builtFor);
    HFn::Type kind() const override { return HFn::kPlugin; }
    bool isAlive() const override { return alive_; }
    /// Handles see it as gone from now on.
    void bury() { alive_ = false; }

    const std::string name;
    const std::string path;       ///< of its file; empty for a plug-in of the application
    const std::string apiVersion; ///< that it was built for
    const std::string& vendor() const { return vendor_; }
    const std::string& version() const { return version_; }
    /// The first call counts.
    void introduce(const std::string& vendor, const std::string& version);

    void registerNode(const std::string& typeName, HTypeId id, HPxNode* (*creator)(), HStatus (*initializer)(),
                      HPxNode::Type type);
    void registerData(const std::string& typeName, HTypeId id, HPxData* (*creator)());
    HStatus registerCommand(const std::string& command, HPxCommand* (*creator)(), HSyntax (*syntax)());
    void registerGPUDeformer(const std::string& nodeType, const std::string& registrant,
                             HGPUDeformerRegistrationInfo* info);

    /// Takes away one registration; throws when it is not this plug-in's, and when it is in use. Nothing happens when
    /// it was taken away in an unload that failed later on.
    void deregister(Registration::Kind kind, HTypeId id);
    void deregister(Registration::Kind kind, const std::string& registered);

    /// To be told when uninitializePlugin has failed, with the registrations of before.
    void unloadFailed(const std::vector<Registration>& before);
    /// What it has taken back in unloads that failed later on; empty unless it is half unloaded.
    const std::vector<Registration>& takenBack() const { return takenBack_; }
    bool hasTakenBack(Registration::Kind kind, const std::string& registered) const;

    /// In order of registration.
    const std::vector<Registration>& registrations() const { return registrations_; }
    /// Users of all that it registered, in one sentence; empty when there are none.
    std::string users() const;
    /// Takes away everything, last first, deleting the nodes that are in the way. Returns what was there; what cannot
    /// be taken away, since data of it exists, stays in registrations().
    std::vector<Registration> removeAll();

private:
    /// Runs `call`, which registers, and remembers the registration unless it throws.
    template <class Call>
    void tracked(Registration registration, Call&& call);
    using Place = std::vector<Registration>::iterator;
    void remove(Place place);
    void removeFrom(const Registration& registration) const;

    std::string vendor_ = "Unknown";
    std::string version_ = "Unknown";
    bool introduced_ = false;
    bool alive_ = true;
    std::vector<Registration> registrations_;
    std::vector<Registration> takenBack_;
};

} // namespace OpenQuarn
