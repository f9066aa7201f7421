// SPDX-License-Identifier: Apache-2.0
// The user's wish that what is being worked on come to an end.
#pragma once

#include "openquarn/HApi.h"

namespace OpenQuarn {

/// With true, long work of plug-ins gives up with a failure from now on (HLongWork::isInterrupted), until it is taken
/// back. Thread: any; a handler of signals may call it.
OPENQUARN_API void setInterrupted(bool isInterrupted) noexcept;

} // namespace OpenQuarn
