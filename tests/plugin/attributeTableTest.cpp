// SPDX-License-Identifier: Apache-2.0
// The attributes of the plug-in's node types are those of the tables in attributes/, in every field.
#include "plugin/AttributeTable.h"

#include "openquarn_app/NodeTypes.h"
#include "plugin/PluginTest.h"

namespace {

using attributeTable::Table;

class AttributeTableTest : public PluginTest, public ::testing::WithParamInterface<const char*> {
protected:
    const Table expected = attributeTable::readTable(std::string(NW_ATTRIBUTE_TABLES) + "/" + GetParam() + ".txt");
    const Table actual = attributeTable::tableOfType(GetParam());
};

TEST_P(AttributeTableTest, EveryFieldIsAsTheTableSays) {
    for (const auto& [name, fields] : expected.attributes) {
        const auto found = actual.attributes.find(name);
        if (found == actual.attributes.end()) {
            ADD_FAILURE() << GetParam() << " has no attribute " << name;
            continue;
        }
        for (const auto& [field, text] : fields)
            EXPECT_EQ(found->second.at(field), text) << name << ": " << field;
    }
}

// which also says that there are no others
TEST_P(AttributeTableTest, AttributesWereAddedInTheOrderOfTheTable) {
    EXPECT_EQ(actual.order, expected.order);
}

TEST_P(AttributeTableTest, DependenciesWereDeclaredInTheOrderOfTheTable) {
    EXPECT_EQ(actual.dependencies, expected.dependencies);
}

INSTANTIATE_TEST_SUITE_P(Types, AttributeTableTest,
                         ::testing::Values("neuralWarp", "controlCollector", "matrixConverter",
                                           "orthoAxisFromMatrixArray"),
                         [](const auto& info) { return std::string(info.param); });

} // namespace
