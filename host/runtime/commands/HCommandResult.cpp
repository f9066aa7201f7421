// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HCommandResult.h"

#include "commands/Results.h"
#include "core/apiCall.h"

#include <algorithm>
#include <limits>
#include <optional>

using OpenQuarn::CommandValue;
using OpenQuarn::isRefused;
using OpenQuarn::Operation;

namespace {

// the value as a whole number, where it is one
std::optional<long long> wholeNumber(const CommandValue& value) {
    if (const auto* flag = std::get_if<bool>(&value))
        return *flag ? 1 : 0;
    if (const auto* number = std::get_if<int>(&value))
        return *number;
    if (const auto* number = std::get_if<long long>(&value))
        return *number;
    return std::nullopt;
}

bool read(const CommandValue& value, int& result) {
    const std::optional<long long> number = wholeNumber(value);
    if (!number || *number < std::numeric_limits<int>::min() || *number > std::numeric_limits<int>::max())
        return false;
    result = static_cast<int>(*number);
    return true;
}

bool read(const CommandValue& value, bool& result) {
    const std::optional<long long> number = wholeNumber(value);
    if (!number || *number < 0 || *number > 1)
        return false;
    result = *number == 1;
    return true;
}

bool read(const CommandValue& value, double& result) {
    const auto* real = std::get_if<double>(&value);
    const std::optional<long long> number = wholeNumber(value);
    if (real)
        result = *real;
    else if (number)
        result = static_cast<double>(*number);
    return real || number;
}

bool read(const CommandValue& value, HString& result) {
    const auto* text = std::get_if<std::string>(&value);
    if (text)
        result = HString(*text);
    return text != nullptr;
}

template <class Item, class Source>
bool readItems(const CommandValue& value, HArray<Item>& result) {
    const auto* items = std::get_if<std::vector<Source>>(&value);
    if (!items || items->size() > HArray<Item>::kMaxLength)
        return false;
    HArray<Item> read(static_cast<unsigned>(items->size()));
    std::copy(items->begin(), items->end(), read.begin());
    result = std::move(read);
    return true;
}

bool read(const CommandValue& value, HIntArray& result) {
    return readItems<int, int>(value, result);
}
bool read(const CommandValue& value, HDoubleArray& result) {
    return readItems<double, double>(value, result) || readItems<double, int>(value, result);
}
bool read(const CommandValue& value, HStringArray& result) {
    return readItems<HString, std::string>(value, result);
}

template <class Result>
HStatus readResult(const CommandValue& value, HCommandResult::Type wanted, Result& result) {
    return OpenQuarn::apiCall(Operation::HCommandResult_getResult, [&]() -> HStatus {
        if (read(value, result))
            return {};
        const std::string shown = std::get_if<long long>(&value) ? " (" + OpenQuarn::printedValue(value) + ")" : "";
        return {HStatus::kFailure, std::string("the result of the command is ") +
                                       OpenQuarn::kindName(OpenQuarn::kindOf(value)) + shown + ", not " +
                                       OpenQuarn::kindName(wanted)};
    });
}

} // namespace

HCommandResult::HCommandResult()
    : impl_(std::make_unique<OpenQuarn::ResultHolder>()) {}
HCommandResult::~HCommandResult() = default;
HCommandResult::HCommandResult(const HCommandResult& other)
    : impl_(std::make_unique<OpenQuarn::ResultHolder>(*other.impl_)) {}
HCommandResult& HCommandResult::operator=(const HCommandResult& other) {
    *impl_ = OpenQuarn::ResultHolder(*other.impl_);
    return *this;
}

HCommandResult::Type HCommandResult::resultType() const noexcept {
    return isRefused(Operation::HCommandResult_resultType) ? kInvalid : OpenQuarn::kindOf(impl_->value);
}

HStatus HCommandResult::getResult(int& result) const {
    return readResult(impl_->value, kInt, result);
}
HStatus HCommandResult::getResult(bool& result) const {
    return readResult(impl_->value, kBool, result);
}
HStatus HCommandResult::getResult(double& result) const {
    return readResult(impl_->value, kDouble, result);
}
HStatus HCommandResult::getResult(HString& result) const {
    return readResult(impl_->value, kString, result);
}
HStatus HCommandResult::getResult(HIntArray& result) const {
    return readResult(impl_->value, kIntArray, result);
}
HStatus HCommandResult::getResult(HDoubleArray& result) const {
    return readResult(impl_->value, kDoubleArray, result);
}
HStatus HCommandResult::getResult(HStringArray& result) const {
    return readResult(impl_->value, kStringArray, result);
}
