// SPDX-License-Identifier: Apache-2.0
// The attributes of the plug-in's node types are those of the tables in attributes/, in every field.
#include "plugin/entry/AttributeTable.h"

#include "plugin/entry/PluginTest.h"

#include <map>
#include <set>

namespace {

using attributeTable::Table;

std::string creatorOf(const std::string& type) {
    const std::string word = type.substr(0, type.find(' '));
    if (word == "string" || word == "mesh" || word == "data")
        return "HFnTypedAttribute::create";
    if (word == "enum")
        return "HFnEnumAttribute::create";
    if (word == "compound")
        return "HFnCompoundAttribute::create";
    return word == "message" ? "HFnMessageAttribute::create" : "HFnNumericAttribute::create";
}

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

// each attribute in turn cannot be made: its turn comes where the table has it, and the others are made all the same
TEST_F(PluginTest, AnAttributeOfTheDeformerThatCannotBeMadeTakesNoOtherWithIt) {
    const Table expected = attributeTable::readTable(NW_ATTRIBUTE_TABLES "/neuralWarp.txt");
    std::map<std::string, int> calls;
    for (const std::string& name : expected.names) {
        SCOPED_TRACE(name);
        const std::string operation = creatorOf(expected.attributes.at(name).at("type"));
        OpenQuarn::unloadPlugin("neuralWarp");
        OpenQuarn::Faults::fail(operation, ++calls[operation]);
        OpenQuarn::loadPlugin(NW_PLUGIN);
        EXPECT_TRUE(OpenQuarn::Faults::fired(operation));
        OpenQuarn::Faults::clear();
        std::set<std::string> wanted(expected.names.begin(), expected.names.end());
        wanted.erase(name);
        if (const auto children = expected.order.find(name); children != expected.order.end())
            for (const std::string& child : children->second)
                wanted.erase(child);
        std::set<std::string> made;
        for (const auto& [attribute, fields] : attributeTable::tableOfType("neuralWarp").attributes)
            made.insert(attribute);
        EXPECT_EQ(made, wanted);
    }
}

INSTANTIATE_TEST_SUITE_P(Types, AttributeTableTest,
                         ::testing::Values("neuralWarp", "controlCollector", "matrixConverter",
                                           "orthoAxisFromMatrixArray"),
                         [](const auto& type) { return std::string(type.param); });

} // namespace
