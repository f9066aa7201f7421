// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HArray.h"

/// Doubles. See HArray.h for the operations.
using HDoubleArray = HArray<double>;
