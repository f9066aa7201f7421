// SPDX-License-Identifier: Apache-2.0
// The words of a command, read by its syntax, with names of nodes looked up.
#pragma once

#include "openquarn/HArgParser.h"

class HSelectionList;

/// A parser that also looks up in the scene what arguments name. `[main]`
class OPENQUARN_API HArgDatabase : public HArgParser {
public:
    /// As HArgParser's. [main]
    HArgDatabase(const HSyntax& syntax, const HArgList& args, HStatus* status = nullptr);

    using HArgParser::getCommandArgument;
    /// Looks up the node or plug that the argument names and puts it into `result`, in place of what was there.
    /// `result` is left alone on failure. Fails with kFailure when the argument was not given or names nothing in the
    /// scene, naming it. [main]
    HStatus getCommandArgument(unsigned index, HSelectionList& result) const;
};
