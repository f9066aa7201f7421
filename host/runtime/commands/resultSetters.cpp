// SPDX-License-Identifier: Apache-2.0
// The static functions of HPxCommand that make the result of the running command.
#include "commands/Results.h"
#include "core/apiCall.h"
#include "openquarn/HPxCommand.h"

#include <algorithm>
#include <iterator>

using OpenQuarn::CommandValue;
using OpenQuarn::isRefused;
using OpenQuarn::Operation;
using OpenQuarn::RunningResult;

namespace {

HStatus noneRuns() {
    return {HStatus::kFailure, "a result was set while no command runs on this thread"};
}

HStatus set(const std::function<CommandValue()>& made) {
    return OpenQuarn::apiCall(Operation::HPxCommand_setResult, [&]() -> HStatus {
        CommandValue* result = RunningResult::current();
        if (!result)
            return noneRuns();
        *result = made();
        return {};
    });
}

std::vector<std::string> textsOf(const HStringArray& values) {
    std::vector<std::string> texts;
    texts.reserve(values.length());
    std::transform(values.begin(), values.end(), std::back_inserter(texts),
                   [](const HString& text) { return text.asStdString(); });
    return texts;
}

// the array of Items that the result is, or that it becomes from nothing or a single Item; null when it is another kind
template <class Item>
std::vector<Item>* arrayOf(CommandValue& result) {
    if (std::holds_alternative<std::monostate>(result))
        result = std::vector<Item>();
    else if (auto* single = std::get_if<Item>(&result))
        result = std::vector<Item>{std::move(*single)};
    return std::get_if<std::vector<Item>>(&result);
}

// integers become doubles when a double joins them
std::vector<double>* doublesOf(CommandValue& result) {
    if (const auto* single = std::get_if<int>(&result))
        result = static_cast<double>(*single);
    if (const auto* integers = std::get_if<std::vector<int>>(&result))
        result = std::vector<double>(integers->begin(), integers->end());
    return arrayOf<double>(result);
}

bool isDoubles(const CommandValue& result) {
    return std::holds_alternative<double>(result) || std::holds_alternative<std::vector<double>>(result);
}

template <class Items, class Array>
bool appendAll(std::vector<Items>* to, const Array& items) {
    if (to)
        to->insert(to->end(), items.begin(), items.end());
    return to != nullptr;
}

template <class Append>
HStatus append(const char* kind, Append&& appendTo) {
    return OpenQuarn::apiCall(Operation::HPxCommand_appendToResult, [&]() -> HStatus {
        CommandValue* result = RunningResult::current();
        if (!result)
            return noneRuns();
        if (!appendTo(*result))
            return {HStatus::kFailure,
                    std::string(kind) + " cannot be appended to " + OpenQuarn::kindName(OpenQuarn::kindOf(*result))};
        return {};
    });
}

template <class Item>
bool appendOne(std::vector<Item>* to, Item item) {
    if (to)
        to->push_back(std::move(item));
    return to != nullptr;
}

} // namespace

void HPxCommand::clearResult() noexcept {
    if (isRefused(Operation::HPxCommand_clearResult))
        return;
    if (CommandValue* result = RunningResult::current())
        *result = std::monostate();
}

HStatus HPxCommand::setResult(int value) {
    return set([&]() -> CommandValue { return value; });
}
HStatus HPxCommand::setResult(unsigned value) {
    return set([&]() -> CommandValue { return static_cast<long long>(value); });
}
HStatus HPxCommand::setResult(bool value) {
    return set([&]() -> CommandValue { return value; });
}
HStatus HPxCommand::setResult(double value) {
    return set([&]() -> CommandValue { return value; });
}
HStatus HPxCommand::setResult(const HString& value) {
    return set([&]() -> CommandValue { return value.asStdString(); });
}
HStatus HPxCommand::setResult(const char* value) {
    return set([&]() -> CommandValue { return std::string(value ? value : ""); });
}
HStatus HPxCommand::setResult(const HIntArray& values) {
    return set([&]() -> CommandValue { return std::vector<int>(values.begin(), values.end()); });
}
HStatus HPxCommand::setResult(const HDoubleArray& values) {
    return set([&]() -> CommandValue { return std::vector<double>(values.begin(), values.end()); });
}
HStatus HPxCommand::setResult(const HStringArray& values) {
    return set([&]() -> CommandValue { return textsOf(values); });
}

HStatus HPxCommand::appendToResult(int value) {
    return append("an integer", [&](CommandValue& result) {
        return isDoubles(result) ? appendOne(doublesOf(result), static_cast<double>(value))
                                 : appendOne(arrayOf<int>(result), value);
    });
}
HStatus HPxCommand::appendToResult(double value) {
    return append("a number", [&](CommandValue& result) { return appendOne(doublesOf(result), value); });
}
HStatus HPxCommand::appendToResult(const HString& value) {
    return append("a text",
                  [&](CommandValue& result) { return appendOne(arrayOf<std::string>(result), value.asStdString()); });
}
HStatus HPxCommand::appendToResult(const char* value) {
    return appendToResult(HString(value));
}
HStatus HPxCommand::appendToResult(const HDoubleArray& values) {
    return append("an array of numbers", [&](CommandValue& result) { return appendAll(doublesOf(result), values); });
}
HStatus HPxCommand::appendToResult(const HStringArray& values) {
    return append("an array of texts",
                  [&](CommandValue& result) { return appendAll(arrayOf<std::string>(result), textsOf(values)); });
}

HCommandResult::Type HPxCommand::currentResultType() noexcept {
    if (isRefused(Operation::HPxCommand_currentResultType))
        return HCommandResult::kInvalid;
    const CommandValue* result = RunningResult::current();
    return result ? OpenQuarn::kindOf(*result) : HCommandResult::kInvalid;
}
