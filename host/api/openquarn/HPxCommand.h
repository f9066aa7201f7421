// SPDX-License-Identifier: Apache-2.0
// Base class of commands.
#pragma once

#include "openquarn/HArgList.h"
#include "openquarn/HCommandResult.h"
#include "openquarn/HStatus.h"
#include "openquarn/HSyntax.h"

#include <memory>

namespace OpenQuarn {
struct CommandType;
}

/// A command. The host makes one by the creator that was registered under its name, calls doIt() once, and destroys
/// it; this host keeps no history, so that undoIt() and redoIt() are for a command's own use. What doIt() throws
/// ends as a failing status. `[main]`
class OPENQUARN_API HPxCommand {
public:
    HPxCommand() noexcept;
    virtual ~HPxCommand();
    HPxCommand(const HPxCommand&) = delete;
    HPxCommand& operator=(const HPxCommand&) = delete;

    /// Does the work. `args` the words after the command's name. The text of a failing status is what the user reads,
    /// behind the name of the command. Commands may run others: each has a result of its own. [main]
    virtual HStatus doIt(const HArgList& args) = 0;
    /// Takes back what doIt() did. The base class fails with kNotImplemented. [main]
    virtual HStatus undoIt();
    /// Does it again. The base class fails with kNotImplemented. [main]
    virtual HStatus redoIt();
    /// True when undoIt() and redoIt() work. The base class: false. [main]
    virtual bool isUndoable() const;
    /// True when the command was registered with a syntax function. [main]
    virtual bool hasSyntax() const;

    /// The syntax of the command, as its syntax function made it when it was registered; an empty one without such a
    /// function, and while the constructor runs. [main]
    HSyntax syntax() const;

    /// Takes the result of the running command away; does nothing while none runs on this thread. [main]
    static void clearResult() noexcept;
    /// Makes the value the result of the running command, in place of what it had; arrays are copied. Fails with
    /// kFailure when no command runs on this thread. [main]
    static HStatus setResult(int value);
    /// As above; its kind is kInt64. [main]
    static HStatus setResult(unsigned value);
    /// As above. [main]
    static HStatus setResult(bool value);
    /// As above. [main]
    static HStatus setResult(double value);
    /// As above. [main]
    static HStatus setResult(const HString& value);
    /// As above. [main]
    static HStatus setResult(const char* value);
    /// As above. [main]
    static HStatus setResult(const HIntArray& values);
    /// As above. [main]
    static HStatus setResult(const HDoubleArray& values);
    /// As above. [main]
    static HStatus setResult(const HStringArray& values);
    /// Appends to the result of the running command: no result becomes an array of one, a single value an array that
    /// begins with it, and integers become doubles when a double is appended. Amortised constant time. Fails with
    /// kFailure, leaving the result as it is, when it holds texts and a number is appended or the reverse, and when no
    /// command runs on this thread. [main]
    static HStatus appendToResult(int value);
    /// As above. [main]
    static HStatus appendToResult(double value);
    /// As above. [main]
    static HStatus appendToResult(const HString& value);
    /// As above. [main]
    static HStatus appendToResult(const char* value);
    /// Appends all values, as above. [main]
    static HStatus appendToResult(const HDoubleArray& values);
    /// Appends all values, as above. [main]
    static HStatus appendToResult(const HStringArray& values);
    /// Kind of the result that the running command has by now; kInvalid for none, and while none runs. [main]
    static HCommandResult::Type currentResultType() noexcept;

    /// Shows the text as an error, as it is. [any]
    static void displayError(const HString& text) noexcept;
    /// Shows the text as a warning, as it is. [any]
    static void displayWarning(const HString& text) noexcept;
    /// Shows the text as it is. [any]
    static void displayInfo(const HString& text) noexcept;

private:
    friend class OpenQuarn::Access;
    std::shared_ptr<const OpenQuarn::CommandType> impl_;
};
