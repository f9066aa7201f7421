// SPDX-License-Identifier: Apache-2.0
// One row for each operation of the API that can fail: how to call it so that it succeeds.
#pragma once

#include "openquarn/HStatus.h"

#include <functional>
#include <memory>
#include <string>
#include <vector>

struct FaultRow {
    std::string operation;         ///< "Class::operation", as in the table of fault points
    std::function<HStatus()> call; ///< sets up what it needs, calls the operation, returns its status
    /// Makes what the calls need but cannot set up while the operation fails; kept until after the calls.
    std::function<std::shared_ptr<void>()> prepare = {};
};

// by family, each in a file of its own
std::vector<FaultRow> commandsRows();
std::vector<FaultRow> geometryRows();
std::vector<FaultRow> graphRows();
std::vector<FaultRow> pluginsRows();
std::vector<FaultRow> servicesRows();
std::vector<FaultRow> valuesRows();
