// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HArray.h"
#include "openquarn/HString.h"

/// Texts. See HArray.h for the operations.
using HStringArray = HArray<HString>;
