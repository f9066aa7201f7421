// SPDX-License-Identifier: Apache-2.0
// What a command accepts: its flags and its arguments.
#pragma once

#include "openquarn/HStatus.h"

#include <limits>
#include <memory>

class HString;

namespace OpenQuarn {
struct Syntax;
}

/// The shape of a command line: `NAME [flags and their arguments] arguments... objects...`, where flags may stand
/// anywhere. A word is a flag when it was not quoted and begins with "-" and a letter; "-5" and "-.5" are numbers.
/// A plug-in fills one in the syntax function that it registers with its command. A value: copies are independent.
/// `[any]` throughout; one object is for one thread at a time.
class OPENQUARN_API HSyntax {
public:
    /// What one argument must be.
    enum ArgType : int {
        kInvalidArgType = 0,
        kNoArg,    ///< No argument.
        kBoolean,  ///< true, on, yes, 1, false, off, no or 0; capitals or not.
        kLong,     ///< An integer from -2^31 to 2^31 - 1.
        kUnsigned, ///< An integer from 0 to 2^32 - 1.
        kDouble,   ///< A finite number.
        kString,   ///< Any text.
    };
    /// What may follow the arguments.
    enum ObjectFormat : int {
        kNone = 0,      ///< Nothing.
        kStringObjects, ///< Words, in a number with limits.
    };

    /// No flags, no arguments, no objects, neither edit nor query mode.
    HSyntax();
    ~HSyntax();
    HSyntax(const HSyntax& other);
    HSyntax& operator=(const HSyntax& other);

    /// Adds a flag of two names with up to six arguments.
    /// `shortName`, `longName` with or without their leading "-"; a letter, then letters, digits and underscores; may
    /// be equal. Fails with kInvalidParameter, naming the flag, for other names, a name that a flag has already, a name
    /// of the two modes (-q, -query, -e, -edit), and a type after a kNoArg. [any]
    HStatus addFlag(const HString& shortName, const HString& longName, ArgType argType1 = kNoArg,
                    ArgType argType2 = kNoArg, ArgType argType3 = kNoArg, ArgType argType4 = kNoArg,
                    ArgType argType5 = kNoArg, ArgType argType6 = kNoArg);
    /// Lets a flag be given more than once. `flag` either name. Fails with kInvalidParameter when there is none. [any]
    HStatus makeFlagMultiUse(const HString& flag);
    /// Adds an argument; arguments are required, in the order they were added. Fails with kInvalidParameter for
    /// kInvalidArgType and kNoArg. [any]
    HStatus addArg(ArgType type);
    /// Says what follows the arguments. Fails with kInvalidParameter when `minimum` is above `maximum`. [any]
    HStatus setObjectType(ObjectFormat format, unsigned minimum = 0,
                          unsigned maximum = std::numeric_limits<unsigned>::max());
    /// Accepts -e (-edit), which only HArgParser::isEdit() shows. [any]
    void enableEdit(bool enable = true);
    /// Accepts -q (-query). With it, flags take no arguments: each asks for its value; arguments may be left out, and
    /// so may objects. [any]
    void enableQuery(bool enable = true);

private:
    friend class OpenQuarn::Access;
    std::unique_ptr<OpenQuarn::Syntax> impl_;
};
