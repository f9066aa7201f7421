// SPDX-License-Identifier: Apache-2.0
// The commands that there are: the host's own, and those of plug-ins.
#pragma once

#include "openquarn/HPxCommand.h"
#include "openquarn/HStatus.h"
#include "openquarn/HSyntax.h"

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace OpenQuarn {

struct CommandType {
    std::string name;
    std::function<HPxCommand*()> create; ///< a new object for the caller to delete; null when there is no memory
    std::optional<HSyntax> syntax;       ///< as the syntax function made it
    const void* owner = nullptr;         ///< the plug-in that registered it; null for the host's own
    std::string summary;                 ///< of the host's own, one line for `help`
    mutable int running = 0;             ///< how many objects of it are at work
};

/// Thread: main.
class CommandRegistry {
public:
    /// The one of the process, with the host's own commands in it.
    static CommandRegistry& instance();
    /// Has `add` put the host's own commands into the one of the process when it is first asked for: they lie in a
    /// folder above this one. True.
    static bool bringOwn(void (*add)(CommandRegistry&)) noexcept;

    /// Adds a command. Fails with kInvalidParameter for a name that is not a letter followed by letters, digits and
    /// underscores, without a creator, and when there is a command of that name already.
    HStatus add(CommandType type);
    /// As above, with the syntax that the function makes (null: none). Fails with kFailure when it throws.
    HStatus add(const std::string& name, std::function<HPxCommand*()> create, const std::function<HSyntax()>& syntax,
                const void* owner);
    /// Takes away a command that this owner added. Fails with kFailure when there is none of that name, when it is
    /// another's, and while it runs.
    HStatus remove(const std::string& name, const void* owner);
    /// Null for none.
    std::shared_ptr<const CommandType> find(const std::string& name) const;
    /// True while a command of this owner runs: the code of the owner must stay where it is.
    bool isRunning(const void* owner) const;
    /// In alphabetical order.
    std::vector<std::string> names() const;

private:
    std::map<std::string, std::shared_ptr<const CommandType>> types_;
};

} // namespace OpenQuarn
