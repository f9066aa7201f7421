// SPDX-License-Identifier: Apache-2.0
// What a plug-in registers with the host.
#pragma once

#include "openquarn/HFnBase.h"
#include "openquarn/HPxData.h"
#include "openquarn/HPxNode.h"
#include "openquarn/HString.h"
#include "openquarn/HTypeId.h"

class HPxCommand;
class HSyntax;

/// The functions of the plug-in object that the host hands to a plug-in's two entry points:
///
///     extern "C" OPENQUARN_API HStatus initializePlugin(HObject plugin);
///     extern "C" OPENQUARN_API HStatus uninitializePlugin(HObject plugin);
///     extern "C" OPENQUARN_API const char HApiVersion[8] = OPENQUARN_API_VERSION;
///
/// initializePlugin registers what the plug-in offers, uninitializePlugin deregisters all of it. When the first fails,
/// the host takes back what was registered until then, and the plug-in is not loaded; when the second fails, the
/// plug-in stays loaded. A plug-in can be unloaded when no node and no data of its types is left.
///
/// The functions given to the host are called until they are deregistered. Every operation fails with
/// kInvalidParameter when the set is not attached to a plug-in. [main] throughout.
class OPENQUARN_API HFnPlugin : public HFnBase {
public:
    /// Attaches the set to a plug-in. The first set that the plug-in makes tells the host its vendor and its version;
    /// later ones change nothing of that.
    /// `requiredApiVersion` "Any", or the version of the H-API that the plug-in needs, as "1.0": the status is a
    /// failure, and the set stays detached, when the host has another number before the dot or a smaller one after it.
    explicit HFnPlugin(const HObject& plugin, const char* vendor = "Unknown", const char* version = "Unknown",
                       const char* requiredApiVersion = "Any", HStatus* status = nullptr);
    ~HFnPlugin() override;
    HFn::Type type() const override { return HFn::kPlugin; }

    /// The name it is known by, which is the name of its file without folder and extension; then what its first set
    /// said, the version of the H-API it was built for, and the folder it was loaded from (empty for a plug-in that is
    /// part of the application). Empty when the set is not attached.
    HString name() const;
    HString vendor() const;
    HString version() const;
    HString apiVersion() const;
    HString loadPath() const;

    /// Registers a node type.
    /// `typeName` a letter or "_", then letters, digits and "_"; `id` not 0: both unique among the registered types.
    /// `creator` makes one object with `new`, which the host owns; it may answer null when it cannot.
    /// `initializer` is called once, now, and adds the attributes of the type (HPxNode::addAttribute); may be null.
    /// `type` the base class of the creator's objects.
    /// Fails with kInvalidParameter for an unusable name, id or creator and for a kind of nodes that there is not; with
    /// kFailure when name or id is taken and when the initializer fails. Nothing is registered then.
    HStatus registerNode(const HString& typeName, const HTypeId& id, HPxNode* (*creator)(), HStatus (*initializer)(),
                         HPxNode::Type type = HPxNode::kDependNode);
    /// Fails with kFailure when this plug-in has not registered the type, and while a node of it is in the scene.
    HStatus deregisterNode(const HTypeId& id);

    /// Registers a data type.
    /// `typeName` not empty, `id` not 0: both unique among the registered data types. `creator` makes one object with
    /// `new`, which the host owns; it may answer null when it cannot.
    /// Fails with kInvalidParameter for an unusable name, id, creator or kind; with kFailure when name or id is taken.
    HStatus registerData(const HString& typeName, const HTypeId& id, HPxData* (*creator)(),
                         HPxData::Type type = HPxData::kData);
    /// Fails with kFailure when this plug-in has not registered the type, and while an object of it exists.
    HStatus deregisterData(const HTypeId& id);

    /// Registers a command.
    /// `name` a letter, then letters, digits and "_", unique among all commands. `creator` makes one object with `new`
    /// for each call of the command. `syntax` is called once, now; null for a command that reads its words itself.
    /// Fails with kInvalidParameter for an unusable name or creator, and when the name is taken; with kFailure when
    /// the syntax function throws.
    HStatus registerCommand(const HString& name, HPxCommand* (*creator)(), HSyntax (*syntax)() = nullptr);
    /// Fails with kFailure when this plug-in has not registered the command, and while it runs.
    HStatus deregisterCommand(const HString& name);

    /// Calls `registrar`, which registers the plug-in's texts (HStringResource::registerString), and returns its
    /// status; what it throws is a kFailure. The texts stay when the plug-in is unloaded.
    /// `resourceFile` is for a file of translated texts, which this host has none of: must be empty, kInvalidParameter
    /// otherwise, as for a null `registrar`.
    HStatus registerUIStrings(HStatus (*registrar)(), const HString& resourceFile);
};
