// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HLongWork.h"
#include "openquarn_app/Interrupt.h"
#include "openquarn_app/Messages.h"

#include <atomic>
#include <cmath>
#include <sstream>

namespace OpenQuarn {
namespace {

std::atomic<bool> interrupted{false};
static_assert(std::atomic<bool>::is_always_lock_free); // for handlers of signals

} // namespace

void setInterrupted(bool isInterrupted) noexcept {
    interrupted.store(isInterrupted, std::memory_order_relaxed);
}

} // namespace OpenQuarn

bool HLongWork::isInterrupted() noexcept {
    return OpenQuarn::interrupted.load(std::memory_order_relaxed);
}

void HLongWork::announce(const HString& what, double seconds) {
    std::ostringstream text;
    text.imbue(std::locale::classic());
    text << what.asStdString() << ": up to " << std::fixed;
    text.precision(0);
    text << (seconds > 1.0 ? std::ceil(seconds) : 1.0) << " s";
    OpenQuarn::showMessage(OpenQuarn::Severity::warning, text.str());
}
