// SPDX-License-Identifier: Apache-2.0
// How attributes are listed, for people and for programs.
#include "quarn/info/attributeTexts.h"

#include "openquarn/HMatrix.h"

#include <gtest/gtest.h>
#include <rapidjson/document.h>

#include <limits>

namespace {

using OpenQuarn::AttributeInfo;

AttributeInfo plain(const char* name, HFn::Type kind, const char* type) {
    AttributeInfo made;
    made.name = name;
    made.shortName = std::string(name).substr(0, 1);
    made.kind = kind;
    made.valueType = type;
    made.readable = made.writable = made.connectable = made.storable = made.indexMatters = true;
    made.keyable = kind == HFn::kNumericAttribute || kind == HFn::kEnumAttribute;
    return made;
}

// an attribute for each thing that a listing says
quarn::AttributeList everything() {
    AttributeInfo group = plain("group", HFn::kCompoundAttribute, "compound");
    group.array = group.inherited = true;
    AttributeInfo ratio = plain("ratio", HFn::kNumericAttribute, "float");
    ratio.parent = "group";
    ratio.defaultNumber = static_cast<double>(0.2F);
    ratio.min = -100000.0;
    ratio.max = std::numeric_limits<double>::infinity();
    ratio.softMin = 0.0001;
    ratio.softMax = 1e20;
    ratio.keyable = ratio.readable = ratio.storable = false;
    AttributeInfo choice = plain("choice", HFn::kEnumAttribute, "enum");
    choice.defaultNumber = 3.0;
    choice.fields = {{0, "None"}, {3, "Two \"words\""}};
    choice.disconnectBehavior = HFnAttribute::kReset;
    AttributeInfo on = plain("on", HFn::kNumericAttribute, "bool");
    on.defaultNumber = 1.0;
    AttributeInfo path = plain("path", HFn::kTypedAttribute, "string");
    path.defaultData = HFnStringData().create("a b");
    path.usedAsFilename = path.keyable = true;
    AttributeInfo matrix = plain("matrix", HFn::kMatrixAttribute, "matrix");
    matrix.defaultData = HFnMatrixData().create(HMatrix());
    AttributeInfo state = plain("state", HFn::kTypedAttribute, "pluginData");
    state.pluginDataType = HTypeId(0x58000972);
    state.hidden = state.usesArrayDataBuilder = true;
    state.writable = state.connectable = state.indexMatters = false;
    state.disconnectBehavior = HFnAttribute::kDelete;
    return {{group, ratio, choice, on, path, matrix, state},
            {{"group", "state", true, true, true},
             {"on", "state", false, false, false},
             {"on", "state", false, true, false}}};
}

TEST(AttributeTextsTest, LinesSayWhatIsNotAsUsual) {
    EXPECT_EQ(
        quarn::attributeLines(everything()),
        "group (g): array of compound, inherited; affects state (with what is below)\n"
        "  ratio (r): float = 0.2, min -100000, max inf, soft min 0.0001, soft max 1e+20, not readable, not storable, "
        "not keyable\n"
        "choice (c): enum {0 None, 3 Two \"words\"} = 3, reset when disconnected\n"
        "on (o): bool = true; affects state\n"
        "path (p): string = \"a b\", keyable, file name\n"
        "matrix (m): matrix = [1 0 0 0 0 1 0 0 0 0 1 0 0 0 0 1]\n"
        "state (s): pluginData 0x58000972, not writable, not connectable, hidden, index does not matter, "
        "array data builder, deleted when disconnected\n");
}

// each row: where in the JSON, and what stands there
TEST(AttributeTextsTest, JsonSaysEverything) {
    rapidjson::Document document;
    document.Parse(quarn::attributeJson(everything()).c_str());
    ASSERT_FALSE(document.HasParseError());
    ASSERT_EQ(document.Size(), 7U);
    const struct {
        unsigned attribute;
        const char* key;
        const char* json;
    } rows[] = {
        {0, "name", R"("group")"},
        {0, "shortName", R"("g")"},
        {0, "parent", "null"},
        {0, "inherited", "true"},
        {0, "kind", R"("compound")"},
        {0, "array", "true"},
        {0, "default", "null"},
        {0, "affects", R"([{"attribute":"state","tree":true,"sameElement":true,"inherited":true}])"},
        {1, "parent", R"("group")"},
        {1, "inherited", "false"},
        {1, "kind", R"("numeric")"},
        {1, "type", R"("float")"},
        {1, "dataTypeId", "null"},
        {1, "fields", "null"},
        {1, "default", "0.2"},
        {1, "min", "-100000"},
        {1, "max", R"("inf")"},
        {1, "softMin", "0.0001"},
        {1, "softMax", "1e20"},
        {1, "readable", "false"},
        {1, "storable", "false"},
        {1, "keyable", "false"},
        {1, "affects", "[]"},
        {2, "default", "3"},
        {2, "fields", R"([{"value":0,"label":"None"},{"value":3,"label":"Two \"words\""}])"},
        {2, "min", "null"},
        {2, "keyable", "true"},
        {2, "disconnect", R"("reset")"},
        {3, "default", "true"},
        {3, "disconnect", R"("nothing")"},
        {4, "default", R"("a b")"},
        {4, "usedAsFilename", "true"},
        {5, "kind", R"("matrix")"},
        {5, "default", "[1,0,0,0,0,1,0,0,0,0,1,0,0,0,0,1]"},
        {6, "kind", R"("typed")"},
        {6, "type", R"("pluginData")"},
        {6, "dataTypeId", "1476397426"},
        {6, "writable", "false"},
        {6, "connectable", "false"},
        {6, "hidden", "true"},
        {6, "indexMatters", "false"},
        {6, "usesArrayDataBuilder", "true"},
        {6, "disconnect", R"("delete")"},
    };
    for (const auto& row : rows) {
        rapidjson::Document expected;
        expected.Parse(row.json);
        ASSERT_FALSE(expected.HasParseError()) << row.json;
        const rapidjson::Value& attribute = document[row.attribute];
        ASSERT_TRUE(attribute.HasMember(row.key)) << row.attribute << ' ' << row.key;
        EXPECT_TRUE(attribute[row.key] == expected) << row.attribute << ' ' << row.key;
    }
    for (const rapidjson::Value& attribute : document.GetArray())
        EXPECT_EQ(attribute.MemberCount(), 25U);
}

} // namespace
