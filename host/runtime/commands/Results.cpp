// SPDX-License-Identifier: Apache-2.0
#include "commands/Results.h"

#include "commands/WordValues.h"

#include <array>
#include <type_traits>

namespace OpenQuarn {
namespace {

thread_local RunningResult* innermost = nullptr;
thread_local int runningCommands = 0;

std::string printedItem(const std::string& item) {
    return item;
}
std::string printedItem(double item) {
    return printedNumber(item);
}
std::string printedItem(int item) {
    return std::to_string(item);
}

template <class Items>
std::string joined(const Items& items, char separator) {
    std::string text;
    for (const auto& item : items) {
        if (&item != &items.front())
            text += separator;
        text += printedItem(item);
    }
    return text;
}

struct Printer {
    std::string operator()(std::monostate /*none*/) const { return {}; }
    std::string operator()(bool value) const { return value ? "true" : "false"; }
    std::string operator()(int value) const { return std::to_string(value); }
    std::string operator()(long long value) const { return std::to_string(value); }
    std::string operator()(double value) const { return printedNumber(value); }
    std::string operator()(const std::string& value) const { return value; }
    std::string operator()(const std::vector<int>& values) const { return joined(values, ' '); }
    std::string operator()(const std::vector<double>& values) const { return joined(values, ' '); }
    std::string operator()(const std::vector<std::string>& values) const { return joined(values, '\n'); }
};

} // namespace

RunningResult::RunningResult()
    : outer_(std::exchange(innermost, this)) {
    ++runningCommands;
}

RunningResult::~RunningResult() {
    innermost = outer_;
    --runningCommands;
}

int RunningResult::depth() {
    return runningCommands;
}

CommandValue* RunningResult::current() {
    return innermost ? &innermost->value_ : nullptr;
}

HCommandResult::Type kindOf(const CommandValue& value) {
    // in the order of the variant
    constexpr std::array kinds{HCommandResult::kInvalid,  HCommandResult::kBool,        HCommandResult::kInt,
                               HCommandResult::kInt64,    HCommandResult::kDouble,      HCommandResult::kString,
                               HCommandResult::kIntArray, HCommandResult::kDoubleArray, HCommandResult::kStringArray};
    static_assert(kinds.size() == std::variant_size_v<CommandValue>);
    return kinds[value.index()];
}

const char* kindName(HCommandResult::Type type) {
    switch (type) {
    case HCommandResult::kInvalid:
        return "nothing";
    case HCommandResult::kInt:
    case HCommandResult::kInt64:
        return "an integer";
    case HCommandResult::kDouble:
        return "a number";
    case HCommandResult::kIntArray:
        return "an array of integers";
    case HCommandResult::kDoubleArray:
        return "an array of numbers";
    case HCommandResult::kBool:
        return "a boolean";
    case HCommandResult::kString:
        return "a text";
    case HCommandResult::kStringArray:
        return "an array of texts";
    }
    return "nothing";
}

std::string printedValue(const CommandValue& value) {
    return std::visit(Printer(), value);
}

} // namespace OpenQuarn
