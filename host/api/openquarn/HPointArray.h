// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HArray.h"
#include "openquarn/HPoint.h"

/// Points, four doubles each; the call that hands them over says their space. See HArray.h for the operations.
using HPointArray = HArray<HPoint>;
