// SPDX-License-Identifier: Apache-2.0
// The command of the deformer.
#pragma once

#include "openquarn/HPxCommand.h"

namespace neuralWarp {

/// Describes models, reloads them, switches export mode and extracts training deltas, for some or all geometries of a
/// neuralWarp node. docs/neuralWarpCommand.md explains the flags. [main]
class neuralWarpCmd final : public HPxCommand {
public:
    static const HString commandName;
    static HPxCommand* create();
    static HSyntax makeSyntax();

    HStatus doIt(const HArgList& args) override;
};

} // namespace neuralWarp
