// SPDX-License-Identifier: Apache-2.0
// Base of the host's own commands. They read their words without the operations of the API, so that a fault on demand
// hits the caller that a test means.
#pragma once

#include "commands/CommandRegistry.h"
#include "commands/ParsedArgs.h"
#include "core/Object.h"
#include "openquarn_app/Commands.h"

#include <limits>
#include <stdexcept>

namespace OpenQuarn {

/// The words of a command that its syntax has accepted. Flags are named without "-".
class Arguments {
public:
    explicit Arguments(const ParsedArgs& parsed)
        : parsed_(parsed) {}

    bool isQuery() const { return parsed_.isQuery; }
    bool has(std::string_view flag) const { return use(flag) != nullptr; }
    /// Argument of a flag; empty when the flag is not given.
    std::string flagText(std::string_view flag) const;
    std::size_t count() const { return parsed_.args.length(); }
    /// Argument `index`, which is below count().
    const std::string& text(std::size_t index) const;
    std::size_t objectCount() const { return parsed_.objects.length(); }
    const std::string& object(std::size_t index) const;
    std::vector<std::string> objects() const;

private:
    const FlagUse* use(std::string_view flag) const;
    const ParsedArgs& parsed_;
};

class Builtin : public HPxCommand {
public:
    HStatus doIt(const HArgList& words) final;

protected:
    /// May throw: the text of what it throws is what the user reads.
    virtual HStatus run(const Arguments& args) = 0;
    /// The result of this command.
    static void give(CommandValue value);
};

/// Builds a syntax in one expression.
class SyntaxBuilder {
public:
    SyntaxBuilder& flag(const char* shortName, const char* longName, HSyntax::ArgType type = HSyntax::kNoArg);
    SyntaxBuilder& arg(HSyntax::ArgType type = HSyntax::kString);
    SyntaxBuilder& objects(unsigned minimum, unsigned maximum = std::numeric_limits<unsigned>::max());
    SyntaxBuilder& query();
    HSyntax done() const { return syntax_; }

private:
    Syntax& held();
    HSyntax syntax_;
};

/// Adds a command of the host, with a line for `help`.
template <class Command>
void addBuiltin(CommandRegistry& registry, const char* name, const char* summary, const SyntaxBuilder& syntax) {
    const HStatus status = registry.add({name, [] { return new Command; }, syntax.done(), nullptr, summary});
    if (status.error())
        throw std::logic_error(status.errorString().asChar()); // a slip in the host itself
}

} // namespace OpenQuarn
