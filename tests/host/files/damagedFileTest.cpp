// SPDX-License-Identifier: Apache-2.0
// Files that are broken, hostile, newer, or that speak of what is not known here.
#include "host/files/FileTest.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Plugins.h"

#include <cmath>
#include <cstdlib>

namespace {

using namespace fileNodes;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using testNodes::connect;
using testNodes::plug;

class DamagedFile : public FileTest {};

/// What is inserted into a scene of a time node and a "fileNode" named "one".
struct SceneParts {
    std::string values = {};      ///< of "one", without braces
    std::string nodeKeys = {};    ///< of "one", each with a comma before it
    std::string connections = {}; ///< without brackets
    std::string sceneKeys = {};   ///< each with a comma before it
};

std::string sceneText(const SceneParts& parts) {
    return R"({"openquarnScene":1,"time":1,"nodes":[{"name":"time1","type":"time"},{"name":"one","type":"fileNode",)"
           R"("values":{)" +
           parts.values + "}" + parts.nodeKeys + "}],\"connections\":[" + parts.connections + "]" + parts.sceneKeys +
           "}";
}

std::string repeated(const std::string& part, int count) {
    std::string text;
    for (int i = 0; i < count; ++i)
        text += part;
    return text;
}

TEST_F(DamagedFile, WhatIsNoSceneFileIsAnErrorAndLeavesTheScene) {
    const struct {
        std::string text;
        const char* error;
    } rows[] = {
        {"", "file: line 1, column 1: The document is empty."},
        {"{\"openquarnScene\":1,\n  \"nodes\":[", "line 2, column 12:"},
        {"{\"openquarnScene\":1}\n}", "line 2, column 1:"},
        {"{\"openquarnScene\":1,\"time\":1e999}", "column 28: Number too big"},
        {"{\"openquarnScene\":1,\"x\":\"\\ud800\"}", "column 26: The surrogate pair"},
        {std::string("{\"openquarnScene\":1}\0{", 22), "column 21: a NUL byte"},
        {"{\"openquarnScene\":1,\"x\":" + repeated("[", 100000), "column 224: nested more than 200 levels deep"},
        {repeated("{\"x\":", 100000), "nested more than 200"},
        {"[1]", "file: is no scene file: it holds no JSON object"},
        {"{}", "no key 'openquarnScene' with a whole number from 1"},
        {"{\"openquarnScene\":0}", "no key 'openquarnScene'"},
        {"{\"openquarnScene\":1.5}", "no key 'openquarnScene'"},
        {"{\"openquarnScene\":\"1\"}", "no key 'openquarnScene'"},
        {"{\"openquarnScene\":4294967296}", "no key 'openquarnScene'"},
    };
    create("present");
    const std::string before = saved();
    for (const auto& row : rows) {
        SCOPED_TRACE(row.text.substr(0, 60));
        EXPECT_THAT(read(row.text), ElementsAre(HasSubstr(row.error)));
        EXPECT_EQ(saved(), before);
    }
}

TEST_F(DamagedFile, EveryTruncationOfASceneIsAnErrorAndLeavesTheScene) {
    create("one");
    plug("one.matrix").setLocked(true);
    const std::string text = saved();
    for (std::size_t length = 0; length < text.size() - 2; ++length) {
        ASSERT_THAT(read(text.substr(0, length)), ElementsAre(HasSubstr("file: line ")));
        ASSERT_EQ(saved(), text);
    }
}

TEST_F(DamagedFile, WhatIsNoMeshIsReportedAndKept) {
    const std::pair<const char*, const char*> rows[] = {
        {"[1]", "it is no object"},
        {R"({"points":[0,0,0],"counts":[]})", "it has no list 'corners'"},
        {R"({"points":[0,0],"counts":[],"corners":[]})", "its points are not three numbers each"},
        {R"({"points":[0,0,"x"],"counts":[],"corners":[]})", "its points are not three numbers each"},
        {R"({"points":[0,0,0],"counts":[3],"corners":[0,0,1]})", "polygon vertex number 2 is 1"},
        {R"({"points":[0,0,0],"counts":[2147483647,2147483647],"corners":[0]})", "polygon 0 ends at"},
        {R"({"points":[0,0,0],"counts":[1],"corners":[0]})", "at least 2"},
        {R"({"points":[0,0,0],"counts":[],"corners":[4294967296]})", "no whole number"},
        {R"({"points":[0,0,0],"counts":[],"corners":[],"uvs":[0,0]})", "it has no list 'uvCorners'"},
        {R"({"points":[0,0,0],"counts":[],"corners":[],"uvs":[0],"uvCorners":[]})", "not two numbers each"},
        {R"({"points":[0,0,0],"counts":[2],"corners":[0,0],"uvs":[0,1e+99],"uvCorners":[0,0]})", "UV 0 is not finite"},
        {R"({"points":[0,0,0],"counts":[2],"corners":[0,0],"uvs":[0,1],"uvCorners":[0,1]})", "corner 1 has UV 1 of 1"},
        {R"({"points":[0,0,0],"counts":[],"corners":[],"tags":{"t":[-1]}})", "lists vertex 4294967295"},
        {R"({"points":[0,0,0],"counts":[],"corners":[],"tags":{"t":[0],"t":[0]}})", "'t' stands twice"},
        {R"({"points":[0,0,0],"counts":[],"corners":[],"tags":{"a b":[0]}})", "'a b' cannot name a component tag"},
    };
    for (const auto& [mesh, warning] : rows) {
        const std::string value = std::string("\"mesh\":") + mesh;
        EXPECT_THAT(read(sceneText({value})), ElementsAre(HasSubstr(warning)));
        EXPECT_THAT(saved(), HasSubstr(value));
    }
}

// Each row is a part of a scene with a node "one"; the warnings it gives; and what is written again. Reading that gives
// the same text.
TEST_F(DamagedFile, WhatIsNotUnderstoodIsReportedAndKept) {
    const struct {
        SceneParts scene;
        std::vector<const char*> warnings;
        std::vector<const char*> kept;
    } rows[] = {
        {{R"("real":"abc","whole":1.5,"small":70000,"single":1e300,"yes":2,"choice":null)"},
         {"the value of 'one.real' is no double", "'one.whole' cannot be set: 1.5 is not an integer", "'one.small'",
          "'one.single' cannot be set: 1e+300 is too large", "'one.yes'", "'one.choice' is no enum"},
         {R"("real":"abc","whole":1.5,"small":70000,"single":1e+300,"yes":2,"choice":null)"}},
        {{R"("real":"nan","matrix":[1,0,0,0,0,1,0,0,0,0,1,0,0,0,"inf",1],"list":[1,"-inf"],"weights":{"1":[2,"nan"]})"},
         {"'one.real' cannot be set: nan is not a finite number; its value is kept", "'one.matrix' cannot be set: inf",
          "'one.list' cannot be set: -inf is not", "'one.weights[2]' cannot be set: nan is not"},
         {R"("real":"nan","matrix":[1,0,0,0,0,1,0,0,0,0,1,0,0,0,"inf",1],"list":[1,"-inf"])", R"("weights[2]":"nan")"}},
        {{R"("word":5,"matrix":[1],"list":[1,"x"],"data":{"typeId":5,"text":"x"},"datas":{"0":[{"typeId":2119630866,"text":"bad"}]})"},
         {"'one.word' is no text", "'one.matrix' is no list of 16 numbers", "'one.list' is no list of numbers",
          "is of data type 0x00000005, not 0x7e570012", "could not be read by its data type: the text is bad"},
         {R"("word":5)", R"("matrix":[1])", R"("list":[1,"x"])", R"("datas[0]":{"typeId":2119630866,"text":"bad"})"}},
        {{R"("unheard":{"of":[1]},"real.x":1,"weights[-1]":2,"real[0]":3,"out":4,"state":{"0":[5]},"groups":6)"},
         {"has no attribute 'unheard'; its value is kept", "'one.real.x'", "'[-1]' is no index",
          "'real' is not an array", "'one.out' is an output", "'one.state' is not kept in scene files",
          "'one.groups' is an array of compounds"},
         {R"("unheard":{"of":[1]},"real.x":1,"weights[-1]":2,"real[0]":3,"out":4,"state":{"0":[5]},"groups":6)"}},
        {{R"("weights":{"2":[1,"x",3],"y":[1],"5":7,"4294967295":[8,9]},"messages":{"1":[5]})"},
         {"'one.weights[3]' is no double", "has a key 'y' that is no run of elements", "has a key '5'",
          "goes beyond the highest index", "'one.messages[1]' is not null"},
         {R"("weights":{"2":[1],"4":[3]})", R"("weights[3]":"x")", R"("weights":{"y":[1]})", R"("weights":{"5":7})",
          R"("weights":{"4294967295":[8,9]})", R"("messages[1]":5)"}},
        {{R"("groups[3]":{"title":"t","new":1,"spot":{"x":2,"z":3}},"data":{"typeId":2119630866,"text":"d","more":4})"},
         {"has no attribute 'new'", "has no attribute 'z'", "'one.data' has a key 'more' that is not known"},
         {R"("groups[3].title":"t","groups[3].spot.x":2)", R"("groups[3].new":1)", R"("groups[3].spot.z":3)",
          R"("data":{"typeId":2119630866,"text":"d"})", R"("data":{"more":4})"}},
        {{"", R"(,"values":7,"locked":["real","none",8],"colour":{"r":0.1},"name":"again")"},
         {"node 'one': the key 'values' stands twice", "'colour' is not known", "'name' stands twice",
          "has no attribute 'none'", "its name is no text"},
         {R"("locked":["real","none",8])", R"("values":7,"colour":{"r":0.1},"name":"again")"}},
        {{"", "", "", R"(,"time":"noon","notes":[{"by":"me"}],"nodes":[])"},
         {"the scene: the key 'time' stands twice", "the scene: the key 'notes' is not known", "'nodes' stands twice"},
         {R"("time":"noon")", R"("notes":[{"by":"me"}])", R"("nodes":[])"}},
        {{"", "", R"(["one.out","two.real"],["none.out","one.real"],["one.none","one.real"],["one","one.real"],["a"],5,
            ["one.word","one.real"],["one.out","one.out"],["time1.outTime","one.weights[7]"],["one.real","one.weights[7]"])"},
         {"'one.out' to 'two.real': there is no node named 'two'", "'none.out' to 'one.real': there is no node",
          "has no attribute 'none'", "'one' names no plug", "is no pair of names", "is no pair of names",
          "a string does not fit a double", "the destination is not writable",
          "is connected from 'time1.outTime'; the connection is dropped"},
         {"\"connections\":[\n[\"time1.outTime\",\"one.weights[7]\"],\n[\"one.out\",\"two.real\"],\n"
          "[\"none.out\",\"one.real\"],\n[\"one.none\",\"one.real\"],\n[\"one\",\"one.real\"],\n[\"a\"],\n5,\n"
          "[\"one.word\",\"one.real\"],\n[\"one.out\",\"one.out\"]\n]"}},
    };
    for (const auto& row : rows) {
        const std::string text = sceneText(row.scene);
        SCOPED_TRACE(text);
        const std::vector<std::string> warnings = read(text);
        ASSERT_EQ(warnings.size(), row.warnings.size()) << ::testing::PrintToString(warnings);
        for (std::size_t i = 0; i < warnings.size(); ++i)
            EXPECT_THAT(warnings[i], HasSubstr(row.warnings[i]));
        const std::string again = saved();
        for (const char* part : row.kept)
            EXPECT_THAT(again, HasSubstr(part));
        EXPECT_THAT(read(again), ::testing::Not(IsEmpty()));
        EXPECT_EQ(saved(), again);
    }
}

// What a command refuses, the reader refuses; what a command brings to a limit, the reader brings there.
TEST_F(DamagedFile, ValuesAreTakenByTheRuleOfSetAttr) {
    const std::pair<std::string, std::vector<std::string>> rows[] = {
        {"real", {"1e308", "nan", "inf"}},
        {"single", {"3.4028236e38", "1e39", "nan"}},
        {"small", {"-32768", "32768"}},
        {"whole", {"2147483647", "2147483648", "0.5"}},
        {"yes", {"1", "2"}},
        {"choice", {"32767", "-32769"}},
        {"narrow", {"10", "10.5", "-1e300", "nan"}},
    };
    for (const auto& [attribute, numbers] : rows)
        for (const std::string& number : numbers) {
            SCOPED_TRACE(attribute + " " + number);
            const std::string name = "one." + attribute;
            session.newScene();
            create("one");
            const bool isSet = OpenQuarn::runCommand("setAttr " + name + " " + number).ok;
            const double value = plug(name).asDouble();
            takeMessages();
            const double wanted = std::strtod(number.c_str(), nullptr);
            const std::string text = std::isfinite(wanted) ? number : "\"" + number + "\"";
            const std::vector<std::string> found = read(sceneText({"\"" + attribute + "\":" + text}));
            EXPECT_EQ(plug(name).asDouble(), value);
            EXPECT_EQ(!found.empty() && found[0].find("'" + name + "' cannot be set: ") != std::string::npos, !isSet);
            if (isSet && wanted != value && attribute != "single") {
                EXPECT_THAT(found, ElementsAre(HasSubstr("'" + name + "' is beyond its limit, ")));
            }
        }
}

TEST_F(DamagedFile, ACycleIsBrokenWhereItCloses) {
    const std::vector<std::string> warnings =
        read(sceneText({"", "", R"(["one.out","one.real"],["one.out","one.weights[2]"])"}));
    EXPECT_THAT(warnings, ElementsAre(HasSubstr("from 'one.out' to 'one.real' closes a cycle; it is dropped"),
                                      HasSubstr("from 'one.out' to 'one.weights[2]' closes a cycle")));
    EXPECT_EQ(plug("one.out").asDouble(), 0.5 + static_cast<double>(0.1F));
}

TEST_F(DamagedFile, TwoNodesOfOneNameGetTwoNames) {
    const std::string one = R"({"name":"one","type":"fileNode"})";
    const std::string other = R"({"name":"one1","type":"fileNode"})";
    const std::vector<std::string> warnings = read("{\"openquarnScene\":1,\"nodes\":[" + one + "," + one + "," + other +
                                                   R"(],"connections":[["one1.out","one.real"]]})");
    EXPECT_THAT(warnings, ElementsAre(HasSubstr("two nodes named 'one'; the second is 'one2' now")));
    EXPECT_EQ(plug("one.real").source().name(), "one1.out");
}

TEST_F(DamagedFile, ValuesThatStandTwiceCountOnce) {
    EXPECT_THAT(read(sceneText({R"("real":1,"real":2)"})), ElementsAre(HasSubstr("'one.real' stands twice")));
    EXPECT_EQ(plug("one.real").asDouble(), 2.0);
}

TEST_F(DamagedFile, AFloodOfWarningsIsCutOff) {
    std::string values = "\"x\":1";
    for (int i = 0; i < 1000; ++i)
        values += ",\"x" + std::to_string(i) + "\":1";
    const std::vector<std::string> warnings = read(sceneText({values}));
    EXPECT_EQ(warnings.size(), 201U);
    EXPECT_EQ(warnings.back(), "file: and 801 more warnings");
    EXPECT_THAT(saved(), HasSubstr("\"x999\":1"));
}

TEST_F(DamagedFile, AFileOfANewerVersionIsReadAsFarAsItGoes) {
    const std::vector<std::string> warnings =
        read(R"({"openquarnScene":9,"nodes":[{"name":"one","type":"fileNode","values":{"real":4}}],"layers":[1]})");
    EXPECT_THAT(warnings, ElementsAre(HasSubstr("the file is of version 9, this host knows versions up to 1"),
                                      HasSubstr("the key 'layers' is not known")));
    EXPECT_EQ(plug("one.real").asDouble(), 4.0);
    EXPECT_THAT(saved(), HasSubstr("\"layers\":[1]"));
}

// --- node types that are not registered ---

class MissingTypes : public FileTest {
protected:
    /// Three nodes in a chain, the middle one of another type, and what it takes to write them.
    static std::string chain(const std::string& type) {
        return R"({
"openquarnScene":1,
"writtenBy":"OpenQuarn",
"time":1,
"plugins":["fileNodes","unheard"],
"nodes":[
{"name":"time1","type":"time","typeId":1330708482},
{"name":"one","type":"fileNode","typeId":2119630865,"plugin":"fileNodes"},
{"name":"two","type":")" +
               type + R"(","typeId":77,"plugin":"unheard","values":{"real":0.1,"a":[-0.0,1e+100,"\u0000é"]},"new":{}},
{"name":"three","type":"fileNode","typeId":2119630865,"plugin":"fileNodes"}
],
"connections":[
["one.out","three.real"],
["one.out","two.real"],
["two.list","three.weights[0]"]
]
}
)";
    }
};

TEST_F(MissingTypes, AreKeptByteByByteInTheirPlaces) {
    const std::string text = chain("unheardOf");
    EXPECT_THAT(read(text),
                ElementsAre(HasSubstr("node type 'unheardOf' of plug-in 'unheard' is not registered: 1 node "
                                      "('two') kept as in the file"),
                            HasSubstr("connections of nodes that could not be created: 2 kept")));
    EXPECT_EQ(session.nodeCount(), 3U);
    EXPECT_EQ(saved(), text);
}

TEST_F(MissingTypes, StayWhileTheSceneChangesAroundThem) {
    read(chain("unheardOf"));
    HFnDependencyNode(plug("one.out").node()).setName("first");
    EXPECT_EQ(HFnDependencyNode(create("two")).name(), "two1") << "its name is taken";
    const std::string text = saved();
    EXPECT_THAT(text, HasSubstr("\"new\":{}},\n{\"name\":\"three\""));
    EXPECT_THAT(text, HasSubstr("[\"first.out\",\"two.real\"]"));
    read(text);
    EXPECT_EQ(saved(), text);

    session.newScene();
    EXPECT_THAT(saved(), ::testing::Not(HasSubstr("two")));
    EXPECT_EQ(HFnDependencyNode(create("two")).name(), "two");
    takeMessages();
}

TEST_F(MissingTypes, ComeBackWhenTheirPluginIsThere) {
    create("one");
    plug("one.real").setDouble(3.0);
    connect("time1.outTime", "one.weights[1]");
    const std::string text = saved();
    session.newScene();
    OpenQuarn::unloadPlugin("fileNodes");
    EXPECT_EQ(read(text).size(), 2U);
    const std::string kept = saved();
    EXPECT_EQ(kept, text);
    registerTypes();
    EXPECT_THAT(read(kept), IsEmpty());
    EXPECT_EQ(plug("one.real").asDouble(), 3.0);
    EXPECT_EQ(saved(), text);
}

TEST_F(MissingTypes, TheIdSaysWhichTypeItIs) {
    EXPECT_THAT(read(R"({"openquarnScene":1,"nodes":[{"name":"one","type":"oldName","typeId":2119630865},
                        {"name":"two","type":"fileNode","typeId":5},{"name":"3","type":"fileNode"},6]})"),
                ElementsAre(HasSubstr("node type 'oldName' is called 'fileNode' now"),
                            HasSubstr("a node that is no object: 1 node"), HasSubstr("a node without a usable name: 1"),
                            HasSubstr("node type 'fileNode' is not registered: 1 node ('two')")));
    EXPECT_EQ(session.nodeCount(), 2U);
}

} // namespace
