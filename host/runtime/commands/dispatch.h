// SPDX-License-Identifier: Apache-2.0
// Runs one command.
#pragma once

#include "commands/ScriptText.h"
#include "openquarn/HStatus.h"
#include "openquarn_app/Commands.h"

namespace OpenQuarn {

/// Makes the command that the first word names, runs it, and gives its result; none when it fails. Fails with its
/// status, whose text begins with its name; with kNotFound when there is no such command; with kFailure when commands
/// run each other too deeply. What the command throws becomes a failing status.
HStatus dispatch(const std::vector<ScriptWord>& words, CommandValue& result) noexcept;

} // namespace OpenQuarn
