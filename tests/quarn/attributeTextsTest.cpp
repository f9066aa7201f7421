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

// what stands there of each attribute, all of the first
TEST(AttributeTextsTest, JsonSaysEverything) {
    rapidjson::Document document, expected;
    ASSERT_FALSE(document.Parse(quarn::attributeJson(everything()).c_str()).HasParseError());
    ASSERT_FALSE(expected
                     .Parse(R"([
        {"name": "group", "shortName": "g", "parent": null, "inherited": true, "kind": "compound", "type": "compound",
         "dataTypeId": null, "fields": null, "default": null, "min": null, "max": null, "softMin": null,
         "softMax": null, "array": true, "readable": true, "writable": true, "connectable": true, "storable": true,
         "keyable": false, "hidden": false, "indexMatters": true, "usesArrayDataBuilder": false,
         "usedAsFilename": false, "disconnect": "nothing",
         "affects": [{"attribute": "state", "tree": true, "sameElement": true, "inherited": true}]},
        {"parent": "group", "inherited": false, "kind": "numeric", "type": "float", "default": 0.2, "min": -100000,
         "max": "inf", "softMin": 0.0001, "softMax": 1e20, "readable": false, "storable": false, "keyable": false,
         "affects": []},
        {"default": 3, "fields": [{"value": 0, "label": "None"}, {"value": 3, "label": "Two \"words\""}],
         "keyable": true, "disconnect": "reset"},
        {"default": true},
        {"default": "a b", "usedAsFilename": true},
        {"kind": "matrix", "default": [1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1]},
        {"kind": "typed", "type": "pluginData", "dataTypeId": 1476397426, "writable": false, "connectable": false,
         "hidden": true, "indexMatters": false, "usesArrayDataBuilder": true, "disconnect": "delete"}])")
                     .HasParseError());
    ASSERT_EQ(document.Size(), expected.Size());
    for (rapidjson::SizeType i = 0; i < expected.Size(); ++i) {
        EXPECT_EQ(document[i].MemberCount(), 25U);
        for (const auto& member : expected[i].GetObject()) {
            ASSERT_TRUE(document[i].HasMember(member.name)) << i << ' ' << member.name.GetString();
            EXPECT_TRUE(document[i][member.name] == member.value) << i << ' ' << member.name.GetString();
        }
    }
}

} // namespace
