// SPDX-License-Identifier: Apache-2.0
#include "host/faults/GraphRig.h"

std::vector<FaultRow> graphRows() {
    std::vector<FaultRow> rows;
    for (const auto& part : {attributeRows(), dataRows(), nodeRows(), plugRows()})
        rows.insert(rows.end(), part.begin(), part.end());
    return rows;
}
