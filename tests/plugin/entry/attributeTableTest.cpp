// SPDX-License-Identifier: Apache-2.0
// The attributes of the plug-in's node types are those of the listings in attributes/, in every field.
#include "openquarn_app/NodeTypes.h"
#include "plugin/entry/PluginTest.h"
#include "quarn/info/attributeTexts.h"

#include <algorithm>
#include <fstream>
#include <iterator>
#include <map>
#include <set>

namespace {

using OpenQuarn::AffectsInfo;
using OpenQuarn::AttributeInfo;

// what the type has itself: of what it inherits only that which affects something of its own, and what
quarn::AttributeList ownOf(const std::string& nodeType) {
    quarn::AttributeList list{OpenQuarn::attributesOf(nodeType), OpenQuarn::dependenciesOf(nodeType)};
    std::erase_if(list.dependencies, [](const AffectsInfo& info) { return info.inherited; });
    std::erase_if(list.attributes, [&](const AttributeInfo& info) {
        return info.inherited &&
               std::none_of(list.dependencies.begin(), list.dependencies.end(),
                            [&](const AffectsInfo& affects) { return affects.affecting == info.name; });
    });
    return list;
}

using AttributeTableTest = PluginTest;

TEST_F(AttributeTableTest, TypesAreAsTheirListingsSay) {
    for (const std::string type : {"neuralWarp", "controlCollector", "matrixConverter", "orthoAxisFromMatrixArray"}) {
        std::ifstream file(std::string(NW_ATTRIBUTE_TABLES "/") + type + ".txt");
        const std::string expected(std::istreambuf_iterator<char>(file), {});
        EXPECT_EQ(quarn::attributeLines(ownOf(type)), expected) << type;
    }
}

// each in turn cannot be made: it is not there, with what was to be in it, and all others are
TEST_F(AttributeTableTest, AnAttributeOfTheDeformerThatCannotBeMadeTakesNoOtherWithIt) {
    const std::map<HFn::Type, const char*> creators = {{HFn::kTypedAttribute, "HFnTypedAttribute::create"},
                                                       {HFn::kEnumAttribute, "HFnEnumAttribute::create"},
                                                       {HFn::kCompoundAttribute, "HFnCompoundAttribute::create"},
                                                       {HFn::kMessageAttribute, "HFnMessageAttribute::create"},
                                                       {HFn::kNumericAttribute, "HFnNumericAttribute::create"}};
    std::vector<AttributeInfo> all = OpenQuarn::attributesOf("neuralWarp");
    std::erase_if(all, [](const AttributeInfo& info) { return info.inherited; });
    std::map<std::string, int> calls;
    std::set<std::string> missed;
    for (const AttributeInfo& one : all) {
        const std::string operation = creators.at(one.kind);
        SCOPED_TRACE(operation + " " + std::to_string(++calls[operation]));
        OpenQuarn::unloadPlugin("neuralWarp");
        OpenQuarn::Faults::fail(operation, calls[operation]);
        OpenQuarn::loadPlugin(NW_PLUGIN);
        EXPECT_TRUE(OpenQuarn::Faults::fired(operation));
        OpenQuarn::Faults::clear();
        std::set<std::string> made;
        for (const AttributeInfo& info : OpenQuarn::attributesOf("neuralWarp"))
            made.insert(info.name);
        std::set<std::string> gone;
        for (const AttributeInfo& info : all)
            if (made.count(info.name) == 0 && (info.parent.empty() || made.count(info.parent) != 0))
                gone.insert(info.name);
        EXPECT_EQ(gone.size(), 1U);
        missed.merge(gone);
    }
    EXPECT_EQ(missed.size(), all.size());
}

} // namespace
