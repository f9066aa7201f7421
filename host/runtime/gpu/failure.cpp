// SPDX-License-Identifier: Apache-2.0
#include "gpu/failure.h"

#include "openquarn/gpu/HOpenCLInfo.h"

#include <exception>
#include <utility>

namespace OpenQuarn {
namespace {

thread_local std::string reason;

} // namespace

cl_int noteFailure(cl_int status, std::string_view call, std::string_view detail) noexcept {
    if (status == CL_SUCCESS || !reason.empty())
        return status;
    try {
        std::string text(call);
        text.append(": ").append(HOpenCLInfo::statusName(status)).append(" (").append(std::to_string(status)) += ')';
        if (!detail.empty())
            text.append(", ").append(detail);
        reason = std::move(text);
    } catch (const std::exception&) { // no memory for the text: the status has to do
    }
    return status;
}

void noteFailure(std::string_view text) noexcept {
    try {
        if (reason.empty())
            reason = text;
    } catch (const std::exception&) { // as above
    }
}

std::string takeFailure() {
    return std::exchange(reason, {});
}

} // namespace OpenQuarn
