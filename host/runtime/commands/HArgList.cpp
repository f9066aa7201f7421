// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HArgList.h"

#include "commands/WordValues.h"
#include "core/apiCall.h"

using OpenQuarn::Operation;

namespace {

template <class Value, class Words>
Value wordAt(Operation point, const Words& words, unsigned index, HStatus* status) {
    return OpenQuarn::apiValue(point, status, Value{}, [&](HStatus& outcome) {
        Value value{};
        if (index < words.size())
            outcome = OpenQuarn::readWord(words[index].text.asStdString(), value);
        else
            outcome = HStatus(HStatus::kFailure, "there is no word " + std::to_string(index) + ": there are " +
                                                     std::to_string(words.size()));
        return value;
    });
}

} // namespace

HString HArgList::asString(unsigned index, HStatus* status) const {
    return wordAt<HString>(Operation::HArgList_asString, impl_, index, status);
}

int HArgList::asInt(unsigned index, HStatus* status) const {
    return wordAt<int>(Operation::HArgList_asInt, impl_, index, status);
}

double HArgList::asDouble(unsigned index, HStatus* status) const {
    return wordAt<double>(Operation::HArgList_asDouble, impl_, index, status);
}

bool HArgList::asBool(unsigned index, HStatus* status) const {
    return wordAt<bool>(Operation::HArgList_asBool, impl_, index, status);
}

void HArgList::addArg(const HString& word) {
    impl_.push_back({word, false});
}

void HArgList::addArg(int value) {
    impl_.push_back({HString(std::to_string(value)), true});
}

void HArgList::addArg(double value) {
    impl_.push_back({HString(OpenQuarn::printedNumber(value)), true});
}
