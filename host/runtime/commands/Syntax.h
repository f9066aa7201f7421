// SPDX-License-Identifier: Apache-2.0
// What an HSyntax holds.
#pragma once

#include "openquarn/HSyntax.h"

#include <limits>
#include <string>
#include <string_view>
#include <vector>

namespace OpenQuarn {

struct SyntaxFlag {
    std::string shortName; // without "-"
    std::string longName;
    std::vector<HSyntax::ArgType> types;
    bool isMultiUse = false;
};

struct Syntax {
    std::vector<SyntaxFlag> flags;
    std::vector<HSyntax::ArgType> args;
    HSyntax::ObjectFormat objects = HSyntax::kNone;
    unsigned minimumObjects = 0;
    unsigned maximumObjects = std::numeric_limits<unsigned>::max();
    bool hasEdit = false;
    bool hasQuery = false;
};

constexpr std::size_t noFlag = std::numeric_limits<std::size_t>::max();

/// Index of the flag of this name, with or without "-"; noFlag for none.
std::size_t flagIndex(const Syntax& syntax, std::string_view name);

/// "an integer" and so on.
const char* argTypeName(HSyntax::ArgType type);

/// True for a word that is a flag when it was not quoted.
bool looksLikeFlag(std::string_view word);

/// The command line that the syntax describes, for people: "[-n|-name a text] a text ...".
std::string describeSyntax(const Syntax& syntax);

} // namespace OpenQuarn
