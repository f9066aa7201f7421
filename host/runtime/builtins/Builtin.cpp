// SPDX-License-Identifier: Apache-2.0
#include "builtins/Builtin.h"

#include "commands/Results.h"
#include "core/Object.h"

#include <algorithm>

namespace OpenQuarn {

const FlagUse* Arguments::use(std::string_view flag) const {
    const std::size_t index = flagIndex(parsed_.syntax, flag);
    const auto found =
        std::find_if(parsed_.uses.begin(), parsed_.uses.end(), [&](const FlagUse& use) { return use.flag == index; });
    return found == parsed_.uses.end() ? nullptr : &*found;
}

std::string Arguments::flagText(std::string_view flag) const {
    const FlagUse* found = use(flag);
    return found && found->args.length() > 0 ? Access::impl(found->args).front().text.asStdString() : std::string();
}

const std::string& Arguments::text(std::size_t index) const {
    return Access::impl(parsed_.args)[index].text.asStdString();
}

const std::string& Arguments::object(std::size_t index) const {
    return Access::impl(parsed_.objects)[index].text.asStdString();
}

std::vector<std::string> Arguments::objects() const {
    std::vector<std::string> texts;
    texts.reserve(objectCount());
    for (std::size_t i = 0; i < objectCount(); ++i)
        texts.push_back(object(i));
    return texts;
}

HStatus Builtin::doIt(const HArgList& words) {
    ParsedArgs parsed;
    parsed.syntax = *Access::impl(*Access::impl(*this)->syntax);
    HStatus status = parseArgs(words, parsed);
    if (status.error())
        return status;
    try {
        return run(Arguments(parsed));
    } catch (const std::bad_alloc&) {
        throw;
    } catch (const std::exception& error) { // the graph says in this way what cannot be done
        return {HStatus::kFailure, error.what()};
    }
}

void Builtin::give(CommandValue value) {
    *RunningResult::current() = std::move(value);
}

Syntax& SyntaxBuilder::held() {
    return *Access::impl(syntax_);
}

SyntaxBuilder& SyntaxBuilder::flag(const char* shortName, const char* longName, HSyntax::ArgType type) {
    SyntaxFlag added{shortName, longName, {}, false};
    if (type != HSyntax::kNoArg)
        added.types.push_back(type);
    held().flags.push_back(std::move(added));
    return *this;
}

SyntaxBuilder& SyntaxBuilder::arg(HSyntax::ArgType type) {
    held().args.push_back(type);
    return *this;
}

SyntaxBuilder& SyntaxBuilder::objects(unsigned minimum, unsigned maximum) {
    held().objects = HSyntax::kStringObjects;
    held().minimumObjects = minimum;
    held().maximumObjects = maximum;
    return *this;
}

SyntaxBuilder& SyntaxBuilder::query() {
    held().hasQuery = true;
    return *this;
}

} // namespace OpenQuarn
