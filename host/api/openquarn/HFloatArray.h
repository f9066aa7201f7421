// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HArray.h"

/// Floats. See HArray.h for the operations.
using HFloatArray = HArray<float>;
