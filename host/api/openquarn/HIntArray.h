// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HArray.h"

/// Signed integers of 32 bits. See HArray.h for the operations.
using HIntArray = HArray<int>;
