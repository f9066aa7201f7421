// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HArray.h"

#include "core/apiCall.h"

#include <string>

using OpenQuarn::Operation;

static_assert(sizeof(unsigned) == 4 && sizeof(int) == 4, "HIntArray and HUintArray hold 32 bits");

HStatus HArrayBase::admit(Call call, std::size_t length) noexcept {
    constexpr Operation points[] = {Operation::HArray_setLength, Operation::HArray_reserve, Operation::HArray_append,
                                    Operation::HArray_assign};
    return OpenQuarn::apiCall(points[static_cast<unsigned>(call)], [&]() -> HStatus {
        return length > std::numeric_limits<unsigned>::max() ? noMemory(call, length) : HStatus::kSuccess;
    });
}

HStatus HArrayBase::noMemory(Call call, std::size_t length) noexcept {
    constexpr const char* names[] = {"setLength", "reserve", "append", "assign"};
    try {
        return {HStatus::kInsufficientMemory, std::string("HArray::") + names[static_cast<unsigned>(call)] +
                                                  ": no memory for a length of " + std::to_string(length)};
    } catch (...) {
        return HStatus::kInsufficientMemory; // the code alone still says it
    }
}

HStatus HArrayBase::nullSource(std::size_t count) noexcept {
    try {
        return {HStatus::kInvalidParameter,
                "HArray::assign: null instead of " + std::to_string(count) + " elements to copy"};
    } catch (...) {
        return HStatus::kInvalidParameter;
    }
}
