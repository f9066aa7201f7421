// SPDX-License-Identifier: Apache-2.0
#include "commands/CommandRegistry.h"

#include "commands/WordValues.h"
#include "core/apiCall.h"

#include <algorithm>
#include <cctype>

namespace OpenQuarn {
namespace {

void (*addOwn)(CommandRegistry&) = nullptr; // constant before any initializer runs

bool isCommandName(const std::string& name) {
    return !name.empty() && std::isalpha(static_cast<unsigned char>(name.front())) != 0 &&
           std::all_of(name.begin(), name.end(), [](unsigned char c) { return std::isalnum(c) != 0 || c == '_'; });
}

} // namespace

CommandRegistry& CommandRegistry::instance() {
    static CommandRegistry registry = [] {
        CommandRegistry filled;
        if (addOwn)
            addOwn(filled);
        return filled;
    }();
    return registry;
}

bool CommandRegistry::bringOwn(void (*add)(CommandRegistry&)) noexcept {
    addOwn = add;
    return true;
}

HStatus CommandRegistry::add(CommandType type) {
    if (!isCommandName(type.name))
        return {HStatus::kInvalidParameter, "no command can have the name " + inQuotes(type.name)};
    if (!type.create)
        return {HStatus::kInvalidParameter, "the command " + inQuotes(type.name) + " has no creator"};
    if (types_.count(type.name) > 0)
        return {HStatus::kInvalidParameter, "there is a command " + inQuotes(type.name) + " already"};
    auto shared = std::make_shared<CommandType>(std::move(type));
    types_.emplace(shared->name, shared);
    return {};
}

HStatus CommandRegistry::add(const std::string& name, std::function<HPxCommand*()> create,
                             const std::function<HSyntax()>& syntax, const void* owner) {
    CommandType type{name, std::move(create), {}, owner, {}};
    try {
        if (syntax)
            type.syntax = syntax();
    } catch (...) {
        return statusOfException(("the syntax function of the command " + inQuotes(name)).c_str());
    }
    return add(std::move(type));
}

HStatus CommandRegistry::remove(const std::string& name, const void* owner) {
    const auto found = types_.find(name);
    if (found == types_.end())
        return {HStatus::kFailure, "there is no command " + inQuotes(name)};
    if (found->second->owner != owner)
        return {HStatus::kFailure, "the command " + inQuotes(name) + " was registered by another"};
    if (found->second->running > 0)
        return {HStatus::kFailure, "the command " + inQuotes(name) + " is running"};
    types_.erase(found);
    return {};
}

std::shared_ptr<const CommandType> CommandRegistry::find(const std::string& name) const {
    const auto found = types_.find(name);
    return found == types_.end() ? nullptr : found->second;
}

bool CommandRegistry::isRunning(const void* owner) const {
    return std::any_of(types_.begin(), types_.end(),
                       [&](const auto& entry) { return entry.second->owner == owner && entry.second->running > 0; });
}

std::vector<std::string> CommandRegistry::names() const {
    std::vector<std::string> names;
    names.reserve(types_.size());
    for (const auto& [name, type] : types_)
        names.push_back(name);
    return names;
}

} // namespace OpenQuarn
