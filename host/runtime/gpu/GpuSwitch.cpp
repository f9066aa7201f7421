// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Gpu.h"

#include <atomic>

namespace OpenQuarn {
namespace {

std::atomic<bool> isOn = false;

} // namespace

void Gpu::setEnabled(bool enabled) {
    isOn = enabled;
}

bool Gpu::isEnabled() noexcept {
    return isOn;
}

} // namespace OpenQuarn
