// SPDX-License-Identifier: Apache-2.0
// Writing lists of doubles into output arrays.
#pragma once

#include "openquarn/HDataBlock.h"

#include <cstdint>
#include <span>

namespace neuralWarp {

/// What becomes of elements beyond the values.
enum class Surplus : std::uint8_t { remove, keep };

/// Sets element k of `array`, an array of doubles that uses array data builders, to value k, lets go of the surplus
/// from the highest index down, and marks the array clean. Stops at the first host call that fails and returns its
/// status: no element has then been added or removed, but those that existed may have new values. [eval]
HStatus writeElements(HArrayDataHandle& array, std::span<const double> values, Surplus surplus);

/// Writes the values into the array `child` of element `index` of `list`, an array of compounds, as writeElements()
/// does. An element that `list` does not have is added through `builder`, the list's own, which the caller sets back.
/// [eval]
HStatus writeListElement(HArrayDataHandle& list, HArrayDataBuilder& builder, unsigned index, const HObject& child,
                         std::span<const double> values, Surplus surplus);

} // namespace neuralWarp
