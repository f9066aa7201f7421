// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HArgParser.h"

#include "commands/ParsedArgs.h"
#include "commands/WordValues.h"
#include "core/Object.h"
#include "core/apiCall.h"

#include <algorithm>

using OpenQuarn::apiCall;
using OpenQuarn::apiValue;
using OpenQuarn::Operation;
using OpenQuarn::ParsedArgs;
using ParsedPointer = std::shared_ptr<const ParsedArgs>;

namespace {

HStatus notParsed() {
    return {HStatus::kFailure, "the arguments of the command could not be read by its syntax"};
}

// one use of a flag
HStatus findUse(const ParsedPointer& parsed, const HString& flag, unsigned use, const OpenQuarn::FlagUse*& found) {
    if (!parsed)
        return notParsed();
    const std::size_t index = OpenQuarn::flagIndex(parsed->syntax, flag.asStdString());
    if (index == OpenQuarn::noFlag)
        return {HStatus::kInvalidParameter, "there is no flag " + OpenQuarn::inQuotes(flag.asStdString())};
    unsigned number = 0;
    for (const OpenQuarn::FlagUse& candidate : parsed->uses)
        if (candidate.flag == index && number++ == use) {
            found = &candidate;
            return {};
        }
    return {HStatus::kFailure, "flag '-" + parsed->syntax.flags[index].longName + "' is given " +
                                   std::to_string(number) + " times: there is no use " + std::to_string(use)};
}

template <class Value>
HStatus readFrom(const HArgList& args, unsigned index, Value& result) {
    const auto& words = OpenQuarn::Access::impl(args);
    if (index >= words.size())
        return {HStatus::kFailure,
                "there is no argument " + std::to_string(index) + ": there are " + std::to_string(words.size())};
    return OpenQuarn::readWord(words[index].text.asStdString(), result);
}

template <class Value>
HStatus readFlag(const ParsedPointer& parsed, const HString& flag, unsigned index, Value& result) {
    return apiCall(Operation::HArgParser_getFlagArgument, [&]() -> HStatus {
        const OpenQuarn::FlagUse* use = nullptr;
        if (HStatus status = findUse(parsed, flag, 0, use); status.error())
            return status;
        return readFrom(use->args, index, result);
    });
}

template <class Value>
HStatus readArgument(const ParsedPointer& parsed, unsigned index, Value& result) {
    return apiCall(Operation::HArgParser_getCommandArgument,
                   [&]() { return parsed ? readFrom(parsed->args, index, result) : notParsed(); });
}

template <class Value>
Value argumentValue(Operation point, const ParsedPointer& parsed, unsigned index, HStatus* status) {
    return apiValue(point, status, Value{}, [&](HStatus& outcome) {
        Value value{};
        outcome = parsed ? readFrom(parsed->args, index, value) : notParsed();
        return value;
    });
}

} // namespace

HArgParser::HArgParser(const HSyntax& syntax, const HArgList& args, HStatus* status)
    : impl_(apiValue(Operation::HArgParser_HArgParser, status, ParsedPointer(),
                     [&](HStatus& outcome) { return OpenQuarn::parseArgs(syntax, args, outcome); })) {}
HArgParser::HArgParser(std::shared_ptr<const OpenQuarn::ParsedArgs> parsed) noexcept
    : impl_(std::move(parsed)) {}
HArgParser::~HArgParser() = default;

bool HArgParser::isFlagSet(const HString& flag, HStatus* status) const {
    return apiValue(Operation::HArgParser_isFlagSet, status, false, [&](HStatus& outcome) {
        if (!impl_)
            outcome = notParsed();
        else if (OpenQuarn::flagIndex(impl_->syntax, flag.asStdString()) == OpenQuarn::noFlag)
            outcome =
                HStatus(HStatus::kInvalidParameter, "there is no flag " + OpenQuarn::inQuotes(flag.asStdString()));
        return numberOfFlagUses(flag) > 0;
    });
}

unsigned HArgParser::numberOfFlagUses(const HString& flag) const noexcept {
    if (!impl_)
        return 0;
    const std::size_t index = OpenQuarn::flagIndex(impl_->syntax, flag.asStdString());
    return static_cast<unsigned>(
        std::count_if(impl_->uses.begin(), impl_->uses.end(), [&](const auto& use) { return use.flag == index; }));
}

unsigned HArgParser::numberOfFlagsUsed() const noexcept {
    return impl_ ? static_cast<unsigned>(impl_->uses.size()) : 0;
}

bool HArgParser::isQuery() const noexcept {
    return impl_ && impl_->isQuery;
}

bool HArgParser::isEdit() const noexcept {
    return impl_ && impl_->isEdit;
}

HStatus HArgParser::getFlagArgument(const HString& flag, unsigned index, bool& result) const {
    return readFlag(impl_, flag, index, result);
}
HStatus HArgParser::getFlagArgument(const HString& flag, unsigned index, int& result) const {
    return readFlag(impl_, flag, index, result);
}
HStatus HArgParser::getFlagArgument(const HString& flag, unsigned index, unsigned& result) const {
    return readFlag(impl_, flag, index, result);
}
HStatus HArgParser::getFlagArgument(const HString& flag, unsigned index, double& result) const {
    return readFlag(impl_, flag, index, result);
}
HStatus HArgParser::getFlagArgument(const HString& flag, unsigned index, HString& result) const {
    return readFlag(impl_, flag, index, result);
}

HStatus HArgParser::getFlagArgumentList(const HString& flag, unsigned use, HArgList& result) const {
    return apiCall(Operation::HArgParser_getFlagArgumentList, [&]() -> HStatus {
        const OpenQuarn::FlagUse* found = nullptr;
        HStatus status = findUse(impl_, flag, use, found);
        if (!status.error())
            result = found->args;
        return status;
    });
}

HString HArgParser::commandArgumentString(unsigned index, HStatus* status) const {
    return argumentValue<HString>(Operation::HArgParser_commandArgumentString, impl_, index, status);
}
int HArgParser::commandArgumentInt(unsigned index, HStatus* status) const {
    return argumentValue<int>(Operation::HArgParser_commandArgumentInt, impl_, index, status);
}
double HArgParser::commandArgumentDouble(unsigned index, HStatus* status) const {
    return argumentValue<double>(Operation::HArgParser_commandArgumentDouble, impl_, index, status);
}
bool HArgParser::commandArgumentBool(unsigned index, HStatus* status) const {
    return argumentValue<bool>(Operation::HArgParser_commandArgumentBool, impl_, index, status);
}

HStatus HArgParser::getCommandArgument(unsigned index, bool& result) const {
    return readArgument(impl_, index, result);
}
HStatus HArgParser::getCommandArgument(unsigned index, int& result) const {
    return readArgument(impl_, index, result);
}
HStatus HArgParser::getCommandArgument(unsigned index, unsigned& result) const {
    return readArgument(impl_, index, result);
}
HStatus HArgParser::getCommandArgument(unsigned index, double& result) const {
    return readArgument(impl_, index, result);
}
HStatus HArgParser::getCommandArgument(unsigned index, HString& result) const {
    return readArgument(impl_, index, result);
}

HStatus HArgParser::getObjects(HArgList& result) const {
    return apiCall(Operation::HArgParser_getObjects, [&]() -> HStatus {
        if (!impl_)
            return notParsed();
        result = impl_->objects;
        return {};
    });
}
