// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HSyntax.h"

#include "commands/Syntax.h"
#include "commands/WordValues.h"
#include "core/apiCall.h"

#include <algorithm>
#include <array>
#include <cctype>

namespace OpenQuarn {
namespace {

std::string_view withoutDash(std::string_view name) {
    return name.substr(!name.empty() && name.front() == '-' ? 1 : 0);
}

bool isLetter(char c) {
    return std::isalpha(static_cast<unsigned char>(c)) != 0;
}

bool isFlagName(std::string_view name) {
    return !name.empty() && isLetter(name.front()) && std::all_of(name.begin(), name.end(), [](char c) {
        return std::isalnum(static_cast<unsigned char>(c)) != 0 || c == '_';
    });
}

HStatus checkFlagName(const Syntax& syntax, std::string_view name) {
    constexpr std::array<std::string_view, 4> modes{"q", "query", "e", "edit"};
    const std::string shown = inQuotes(name);
    if (!isFlagName(name))
        return {HStatus::kInvalidParameter, "no flag can have the name " + shown};
    if (std::find(modes.begin(), modes.end(), name) != modes.end())
        return {HStatus::kInvalidParameter, "the name " + shown + " belongs to the query and edit modes"};
    if (flagIndex(syntax, name) != noFlag)
        return {HStatus::kInvalidParameter, "there is a flag with the name " + shown + " already"};
    return {};
}

// the types before the first kNoArg; a type after it, or an invalid one, is an error
HStatus readTypes(const std::array<HSyntax::ArgType, 6>& types, std::vector<HSyntax::ArgType>& used) {
    const auto* const end = std::find(types.begin(), types.end(), HSyntax::kNoArg);
    if (std::any_of(end, types.end(), [](HSyntax::ArgType type) { return type != HSyntax::kNoArg; }))
        return {HStatus::kInvalidParameter, "an argument after kNoArg"};
    if (std::any_of(types.begin(), end, [](HSyntax::ArgType type) { return !argTypeName(type); }))
        return {HStatus::kInvalidParameter, "an argument of no known type"};
    used.assign(types.begin(), end);
    return {};
}

HStatus addFlagTo(Syntax& syntax, SyntaxFlag flag, const std::array<HSyntax::ArgType, 6>& types) {
    for (const std::string& name : {flag.shortName, flag.longName})
        if (HStatus status = checkFlagName(syntax, name); status.error())
            return status;
    if (const HStatus status = readTypes(types, flag.types); status.error())
        return {status.statusCode(), "flag '-" + flag.longName + "': " + status.errorString().asChar()};
    syntax.flags.push_back(std::move(flag));
    return {};
}

void describeFlag(const SyntaxFlag& flag, std::string& text) {
    text += "[-" + flag.shortName;
    if (flag.longName != flag.shortName)
        text += "|-" + flag.longName;
    for (const HSyntax::ArgType type : flag.types)
        text += std::string(" <") + argTypeName(type) + ">";
    text += flag.isMultiUse ? "]... " : "] ";
}

} // namespace

std::size_t flagIndex(const Syntax& syntax, std::string_view name) {
    name = withoutDash(name);
    for (std::size_t i = 0; i < syntax.flags.size(); ++i)
        if (syntax.flags[i].shortName == name || syntax.flags[i].longName == name)
            return i;
    return noFlag;
}

const char* argTypeName(HSyntax::ArgType type) {
    switch (type) {
    case HSyntax::kBoolean:
        return "boolean";
    case HSyntax::kLong:
        return "integer";
    case HSyntax::kUnsigned:
        return "unsigned integer";
    case HSyntax::kDouble:
        return "number";
    case HSyntax::kString:
        return "text";
    case HSyntax::kInvalidArgType:
    case HSyntax::kNoArg:
        break;
    }
    return nullptr;
}

bool looksLikeFlag(std::string_view word) {
    return word.size() > 1 && word[0] == '-' && isLetter(word[1]);
}

std::string describeSyntax(const Syntax& syntax) {
    std::string text;
    if (syntax.hasQuery)
        text += "[-q|-query] ";
    if (syntax.hasEdit)
        text += "[-e|-edit] ";
    for (const SyntaxFlag& flag : syntax.flags)
        describeFlag(flag, text);
    for (const HSyntax::ArgType type : syntax.args)
        text += std::string("<") + argTypeName(type) + "> ";
    if (syntax.objects == HSyntax::kStringObjects)
        text += "<text>... ";
    if (!text.empty())
        text.pop_back();
    return text;
}

} // namespace OpenQuarn

using OpenQuarn::apiCall;
using OpenQuarn::Operation;

HSyntax::HSyntax()
    : impl_(std::make_unique<OpenQuarn::Syntax>()) {}
HSyntax::~HSyntax() = default;
HSyntax::HSyntax(const HSyntax& other)
    : impl_(std::make_unique<OpenQuarn::Syntax>(*other.impl_)) {}
HSyntax& HSyntax::operator=(const HSyntax& other) {
    *impl_ = OpenQuarn::Syntax(*other.impl_);
    return *this;
}

HStatus HSyntax::addFlag(const HString& shortName, const HString& longName, ArgType argType1, ArgType argType2,
                         ArgType argType3, ArgType argType4, ArgType argType5, ArgType argType6) {
    return apiCall(Operation::HSyntax_addFlag, [&]() -> HStatus {
        OpenQuarn::SyntaxFlag flag{std::string(OpenQuarn::withoutDash(shortName.asStdString())),
                                   std::string(OpenQuarn::withoutDash(longName.asStdString())),
                                   {},
                                   false};
        return OpenQuarn::addFlagTo(*impl_, std::move(flag),
                                    {argType1, argType2, argType3, argType4, argType5, argType6});
    });
}

HStatus HSyntax::makeFlagMultiUse(const HString& flag) {
    return apiCall(Operation::HSyntax_makeFlagMultiUse, [&]() -> HStatus {
        const std::size_t index = OpenQuarn::flagIndex(*impl_, flag.asStdString());
        if (index == OpenQuarn::noFlag)
            return {HStatus::kInvalidParameter, "there is no flag " + OpenQuarn::inQuotes(flag.asStdString())};
        impl_->flags[index].isMultiUse = true;
        return {};
    });
}

HStatus HSyntax::addArg(ArgType type) {
    return apiCall(Operation::HSyntax_addArg, [&]() -> HStatus {
        if (!OpenQuarn::argTypeName(type))
            return {HStatus::kInvalidParameter, "an argument of no known type"};
        impl_->args.push_back(type);
        return {};
    });
}

HStatus HSyntax::setObjectType(ObjectFormat format, unsigned minimum, unsigned maximum) {
    return apiCall(Operation::HSyntax_setObjectType, [&]() -> HStatus {
        if (minimum > maximum)
            return {HStatus::kInvalidParameter, "at least " + std::to_string(minimum) + " objects and at most " +
                                                    std::to_string(maximum) + " leave no number of them"};
        impl_->objects = format;
        impl_->minimumObjects = minimum;
        impl_->maximumObjects = maximum;
        return {};
    });
}

void HSyntax::enableEdit(bool enable) {
    impl_->hasEdit = enable;
}

void HSyntax::enableQuery(bool enable) {
    impl_->hasQuery = enable;
}
