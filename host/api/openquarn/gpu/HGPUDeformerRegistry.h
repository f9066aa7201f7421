// SPDX-License-Identifier: Apache-2.0
// The node types that have a GPU version.
#pragma once

#include "openquarn/HStatus.h"
#include "openquarn/HString.h"
#include "openquarn/gpu/HGPUDeformerRegistrationInfo.h"

/// Both operations belong into a plug-in's entry points, and fail with kFailure elsewhere. [main]
class OPENQUARN_API HGPUDeformerRegistry {
public:
    HGPUDeformerRegistry() = delete;

    /// Registers the GPU version of a node type.
    /// `nodeType` name of the type, which need not be registered yet; `registrantId` a name of the maker's own choice;
    /// `info` stays the plug-in's, and has to live until it is deregistered.
    /// Fails with kInvalidParameter for an empty name or a null `info`; with kFailure when the type has one already.
    static HStatus registerGPUDeformerCreator(const HString& nodeType, const HString& registrantId,
                                              HGPUDeformerRegistrationInfo* info);
    /// Fails with kFailure when this plug-in has registered none for the type under this id.
    static HStatus deregisterGPUDeformerCreator(const HString& nodeType, const HString& registrantId);
};
