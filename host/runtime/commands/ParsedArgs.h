// SPDX-License-Identifier: Apache-2.0
// The words of a command, sorted by its syntax.
#pragma once

#include "commands/Syntax.h"
#include "openquarn/HArgList.h"

#include <vector>

namespace OpenQuarn {

struct FlagUse {
    std::size_t flag; // index in the syntax
    HArgList args;
};

struct ParsedArgs {
    Syntax syntax;
    std::vector<FlagUse> uses; // as they were written
    HArgList args;
    HArgList objects;
    bool isQuery = false;
    bool isEdit = false;
};

/// Sorts the words into `parsed`, whose syntax is set. Fails with kFailure and what is wrong with which word.
HStatus parseArgs(const HArgList& words, ParsedArgs& parsed);
/// The words sorted by the syntax; null, with a failing status, where that cannot be done.
std::shared_ptr<const ParsedArgs> parseArgs(const HSyntax& syntax, const HArgList& words, HStatus& status);

} // namespace OpenQuarn
