// SPDX-License-Identifier: Apache-2.0
// Every operation of the API that can fail is made to fail once, and works before and after it.
#include "host/faults/FaultRows.h"

#include "openquarn/HString.h"
#include "openquarn_app/Faults.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <stdexcept>

namespace {

using OpenQuarn::Faults;

std::vector<FaultRow> allRows() {
    std::vector<FaultRow> rows;
    for (const auto& family :
         {commandsRows(), geometryRows(), graphRows(), pluginsRows(), servicesRows(), valuesRows()})
        rows.insert(rows.end(), family.begin(), family.end());
    return rows;
}

TEST(Faults, EveryOperationFailsOnDemandAndRecovers) {
    for (const FaultRow& row : allRows()) {
        SCOPED_TRACE(row.operation);
        Faults::clear();
        const std::shared_ptr<void> kept = row.prepare ? row.prepare() : nullptr;
        const HStatus before = row.call();
        EXPECT_FALSE(before.error()) << before.errorString().asChar();

        Faults::fail(row.operation);
        const HStatus failed = row.call();
        EXPECT_TRUE(Faults::fired(row.operation));
        // by this operation, and no other that it is needed for
        EXPECT_THAT(failed.errorString().asStdString(), testing::HasSubstr(row.operation + ": failed on demand"));

        Faults::clear();
        const HStatus after = row.call();
        EXPECT_FALSE(after.error()) << after.errorString().asChar();
    }
}

TEST(Faults, EveryOperationHasARow) {
    std::set<std::string> withRow;
    for (const FaultRow& row : allRows())
        withRow.insert(row.operation);
    for (const std::string& operation : Faults::operations())
        EXPECT_EQ(withRow.count(operation), 1U) << operation << " has no row";
}

TEST(Faults, CountsCallsAndRefusesWhatItDoesNotKnow) {
    EXPECT_THROW(Faults::fail("HNothing::atAll"), std::invalid_argument);
    EXPECT_THROW(Faults::fired(""), std::invalid_argument);
    EXPECT_THROW(Faults::fail(Faults::operations().front(), 0), std::invalid_argument);
}

} // namespace
