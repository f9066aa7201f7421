// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HArray.h"
#include "openquarn/HObject.h"

/// Handles on objects; the array keeps alive what the handles keep alive. See HArray.h for the operations.
using HObjectArray = HArray<HObject>;
