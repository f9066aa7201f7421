// SPDX-License-Identifier: Apache-2.0
// The words of a command, read by its syntax.
#pragma once

#include "openquarn/HArgList.h"
#include "openquarn/HStatus.h"
#include "openquarn/HString.h"
#include "openquarn/HSyntax.h"

#include <memory>

namespace OpenQuarn {
struct ParsedArgs;
}

/// Checks the words of a command against its syntax and gives them by flag and position. Flags are named by either of
/// their names, with or without the leading "-"; indices count from 0. Copies share what was read, which never changes.
/// `[any]` throughout.
class OPENQUARN_API HArgParser {
public:
    /// Reads the words. Fails with kFailure, saying what is wrong with which word: an unknown flag, a flag given twice
    /// that is not multi-use, an argument that is missing or of the wrong type, too many arguments. Everything that
    /// is asked of a parser that failed fails too. [any]
    HArgParser(const HSyntax& syntax, const HArgList& args, HStatus* status = nullptr);
    virtual ~HArgParser();
    HArgParser(const HArgParser&) = default;
    HArgParser& operator=(const HArgParser&) = default;

    /// True when the flag was given. Fails with kInvalidParameter when the syntax has no such flag. [any]
    bool isFlagSet(const HString& flag, HStatus* status = nullptr) const;
    /// How often the flag was given; 0 for one that the syntax does not have. [any]
    unsigned numberOfFlagUses(const HString& flag) const noexcept;
    /// Number of flags given, each use counted. [any]
    unsigned numberOfFlagsUsed() const noexcept;
    /// True when -q was given. [any]
    bool isQuery() const noexcept;
    /// True when -e was given. [any]
    bool isEdit() const noexcept;

    /// Reads argument `index` of the first use of the flag. `result` is left alone on failure. Fails with
    /// kInvalidParameter when the syntax has no such flag; with kFailure when the flag was not given, has no such
    /// argument (in query mode it has none), or the argument cannot be read as this type. [any]
    HStatus getFlagArgument(const HString& flag, unsigned index, bool& result) const;
    /// As above. [any]
    HStatus getFlagArgument(const HString& flag, unsigned index, int& result) const;
    /// As above. [any]
    HStatus getFlagArgument(const HString& flag, unsigned index, unsigned& result) const;
    /// As above. [any]
    HStatus getFlagArgument(const HString& flag, unsigned index, double& result) const;
    /// As above. [any]
    HStatus getFlagArgument(const HString& flag, unsigned index, HString& result) const;
    /// Gives all arguments of one use of the flag, `use` counted from 0 in the order they were written. `result` is
    /// left alone on failure. Fails as above, and with kFailure when there are not that many uses. [any]
    HStatus getFlagArgumentList(const HString& flag, unsigned use, HArgList& result) const;

    /// The argument as text. Fails with kFailure when it was not given; empty then. [any]
    HString commandArgumentString(unsigned index, HStatus* status = nullptr) const;
    /// The argument as an integer. Fails with kFailure when it was not given or is none; 0 then. [any]
    int commandArgumentInt(unsigned index, HStatus* status = nullptr) const;
    /// The argument as a number. Fails as above. [any]
    double commandArgumentDouble(unsigned index, HStatus* status = nullptr) const;
    /// The argument as a boolean. Fails as above, false then. [any]
    bool commandArgumentBool(unsigned index, HStatus* status = nullptr) const;

    /// Reads an argument. `result` is left alone on failure. Fails with kFailure when it was not given or cannot be
    /// read as this type. [any]
    HStatus getCommandArgument(unsigned index, bool& result) const;
    /// As above. [any]
    HStatus getCommandArgument(unsigned index, int& result) const;
    /// As above. [any]
    HStatus getCommandArgument(unsigned index, unsigned& result) const;
    /// As above. [any]
    HStatus getCommandArgument(unsigned index, double& result) const;
    /// As above. [any]
    HStatus getCommandArgument(unsigned index, HString& result) const;

    /// Gives the words that follow the arguments, by HSyntax::setObjectType(). Replaces `result`. Fails with kFailure
    /// when the words could not be read by the syntax. [any]
    HStatus getObjects(HArgList& result) const;

protected:
    explicit HArgParser(std::shared_ptr<const OpenQuarn::ParsedArgs> parsed) noexcept;

private:
    friend class OpenQuarn::Access;
    std::shared_ptr<const OpenQuarn::ParsedArgs> impl_;
};
