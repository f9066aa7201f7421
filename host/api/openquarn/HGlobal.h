// SPDX-License-Identifier: Apache-2.0
// What belongs to the host as a whole: its displays, its commands, its folder of resources.
#pragma once

#include "openquarn/HStatus.h"
#include "openquarn/HString.h"

class HCommandResult;

class OPENQUARN_API HGlobal {
public:
    HGlobal() = delete;

    /// Shows a text to the user as it is, without a final newline: something could not be done. [any]
    static void displayError(const HString& text) noexcept;
    /// The same: the work was done, and the user should look at it. [any]
    static void displayWarning(const HString& text) noexcept;
    /// The same: an answer, or progress. [any]
    static void displayInfo(const HString& text) noexcept;

    /// The folder that holds what the host reads at run time (kernel sources below "GPUBuiltInDeformer/kernels"), as an
    /// absolute path without a separator at its end. It is the application's to set; until then, the resource folder
    /// that lies beside the host library or is installed with it. Need not exist. [any]
    static HString getAbsolutePathToResources();

    /// Runs one command line and keeps its result.
    /// `command` name, flags and arguments, with the quoting of command scripts.
    /// `result` receives the result; is emptied when the command fails.
    /// `displayEnabled` shows the command and its result as an info message.
    /// `undoEnabled` is for a host that keeps an undo history; this one keeps none.
    /// Fails with the status of the command, or when there is none of its name. [main]
    static HStatus executeCommand(const HString& command, HCommandResult& result, bool displayEnabled = false,
                                  bool undoEnabled = false);
    /// The same, for a command whose result does not matter. [main]
    static HStatus executeCommand(const HString& command, bool displayEnabled = false, bool undoEnabled = false);
};
