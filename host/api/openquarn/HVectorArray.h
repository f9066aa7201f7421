// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HArray.h"
#include "openquarn/HVector.h"

/// Vectors, three doubles each. See HArray.h for the operations.
using HVectorArray = HArray<HVector>;
