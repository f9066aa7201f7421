// SPDX-License-Identifier: Apache-2.0
// The host's commands on nodes, values and connections: what they do, and what
// they say about what they cannot do.
#include "host/files/fileNodes.h"
#include "host/support/SceneTest.h"

#include "openquarn/HArgDatabase.h"
#include "openquarn/HFnMeshData.h"
#include "openquarn/HSelectionList.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Workspace.h"
#include "support/TemporaryFolder.h"

namespace {

using namespace testNodes;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

struct Row {
    const char* command;
    const char* expected; // what it prints, or what its error contains
};

class GraphCommands : public SceneTest {
protected:
    static std::string print(const std::string& command) {
        const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand(command);
        EXPECT_TRUE(outcome.ok) << command << ": " << outcome.error;
        return OpenQuarn::printedValue(outcome.result);
    }
    static std::string error(const std::string& command) {
        const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand(command);
        EXPECT_FALSE(outcome.ok) << command;
        return outcome.error;
    }
    static void expectPrints(const std::vector<Row>& rows) {
        for (const Row& row : rows)
            EXPECT_EQ(print(row.command), row.expected) << row.command;
    }
    static void expectErrors(const std::vector<Row>& rows) {
        for (const Row& row : rows)
            EXPECT_THAT(error(row.command), HasSubstr(row.expected)) << row.command;
    }
};

TEST_F(GraphCommands, OnNodes) {
    expectPrints({
        {"createNode testSum", "testSum1"},
        {"createNode testSum -name arm", "arm"},
        {"createNode -n arm testSum", "arm1"},
        {"createNode testLists -n armList", "armList"},
        {"ls", "time1\ntestSum1\narm\narm1\narmList"},
        {"ls arm*", "arm\narm1\narmList"},
        {"ls ?ime1 *1", "time1\ntestSum1\narm1"},
        {"ls -type testSum a*", "arm\narm1"},
        {"ls nothing", ""},
        {"rename arm1 leg", "leg"},
        {"deleteNode leg testSum1 leg", ""},
        {"ls -type testSum", "arm"},
        {"listAttr armList", "message\nlists\nlists.items\nlists.weight\nnote\nshallow\nshallow."
                             "leaf\nshallow.own\nflat\nshallowOut"},
    });
    expectErrors({
        {"createNode nope", "createNode: there is no node type 'nope'"},
        {"createNode testSum -name 1a", "'1a'"},
        {"createNode dependNode", "cannot be created"},
        {"deleteNode arm nope", "deleteNode: there is no node 'nope'"},
        {"deleteNode time1", "the time node 'time1' cannot be deleted"},
        {"deleteNode", "too few arguments"},
        {"rename arm time1", "'time1'"},
        {"ls -type nope", "there is no node type 'nope'"},
        {"listAttr nope", "there is no node 'nope'"},
    });
    EXPECT_EQ(print("ls arm"), "arm"); // nothing was deleted with the unknown one
}

TEST_F(GraphCommands, SetAndGetEveryKindOfValue) {
    create("testSum", "n");
    const std::string identity = "1 0 0 0 0 1 0 0 0 0 1 0 0 0 0 1";
    EXPECT_EQ(print("getAttr n.matrix"), identity);
    print("setAttr -type matrix n.matrix 1 2 3 4 5 6 7 8 9 10 11 12 -13 14 15 .5");
    expectPrints({
        {"getAttr n.matrix", "1 2 3 4 5 6 7 8 9 10 11 12 -13 14 15 0.5"},
        {"setAttr n.bare 0.1; getAttr n.bare", "0.1"},
        {"setAttr n.single 0.1; getAttr n.single", "0.1"},
        {"setAttr n.int32 -2147483648; getAttr n.int32", "-2147483648"},
        {"setAttr n.short16 12; getAttr n.short16", "12"},
        {"setAttr n.skip on; getAttr n.skip", "true"},
        {"setAttr n.choice Five; getAttr n.choice", "5"},
        {"getAttr -asString n.choice", "Five"},
        {"setAttr n.choice 0; getAttr -asString n.choice", "Zero"},
        {"setAttr -type string n.text \"-a b\"; getAttr n.text", "-a b"},
        {"setAttr -type string n.text '-c'; getAttr n.text", "-c"}, // what is quoted is no flag
        {"setAttr n.text ''; getAttr n.text", ""},
        {"setAttr n.scale 1e6; getAttr n.scale", "100"}, // its limit
        {"setAttr n.values 1 -2 3; getAttr n.values", "1 -2 3"},
        {"setAttr n.values[4000000000] 9; getAttr n.values", "1 -2 3 9"},
        {"getAttr -multiIndices n.values", "0 1 2 4000000000"},
        {"getAttr n.total", "0"}, // skip is on
        {"setAttr n.skip off; setAttr n.scale 2; getAttr n.total", "22"},
    });
}

TEST_F(GraphCommands, RefuseValuesAndChangeNothing) {
    create("testSum", "n");
    create("testLists", "l");
    print("setAttr -lock on n.bare 3; setAttr n.values 5 6; setAttr -lock on n.values[1]");
    expectErrors({
        {"setAttr n 1", "'n' names no plug"},
        {"setAttr n.nope 1", "node type 'testSum' has no attribute 'nope'"},
        {"setAttr n.total 1", "'n.total' is an output and cannot be set"},
        {"setAttr n.bare 1", "'n.bare' is locked"},
        {"setAttr n.scale x", "'n.scale' cannot be set: 'x' is not a finite number"},
        {"setAttr n.scale", "'n.scale' takes one value, not 0"},
        {"setAttr n.scale 1 2", "'n.scale' takes one value, not 2"},
        {"setAttr n.int32 1.5", "'1.5' is not an integer"},
        {"setAttr n.skip 2", "'2' is not a boolean"},
        {"setAttr n.choice one", "'one' is neither a number nor one of its labels (Zero, One, Five)"},
        {"setAttr n.choice 40000", "'40000' is neither"},
        {"setAttr n.matrix 1 2 3", "takes the 16 numbers of a matrix, row by row, not 3"},
        {"setAttr -type string n.scale 1", "'n.scale' is of type double, not 'string'"},
        {"setAttr n.values 7 8", "'n.values[1]' is locked"},
        {"setAttr n.values x 8", "'x' is not a finite number"},
        {"setAttr n.values", "takes the values of its elements"},
        {"setAttr l.shallow 1", "'l.shallow' is a compound"},
        {"setAttr n.message 1", "'n.message' is of type message"},
        {"getAttr l.shallow", "'l.shallow' is a compound"},
        {"getAttr l.lists", "'l.lists' is an array of type compound"},
        {"getAttr n.message", "'n.message' is of type message"},
        {"getAttr n.values[7]", "'n.values[7]' does not exist"},
        {"getAttr -asString n.scale", "'n.scale' has no label"},
        {"getAttr -multiIndices n.scale", "'n.scale' is not an array"},
    });
    expectPrints({
        {"getAttr n.values", "5 6"},
        {"getAttr n.bare", "3"},
        {"getAttr -lock n.bare", "true"},
        {"setAttr -lock off n.bare 4; getAttr n.bare", "4"},
        {"getAttr -lock n.bare", "false"},
    });
}

TEST_F(GraphCommands, ConnectAndListConnections) {
    for (const char* name : {"a", "b", "c"})
        create("testSum", name);
    expectPrints({
        {"connectAttr a.total c.values[2]; connectAttr a.rounded c.scale; "
         "connectAttr c.total b.values[0]",
         ""},
        {"listConnections c", "a\nb"},
        {"listConnections -source -plugs c", "a.total\na.rounded"},
        {"listConnections -destination -plugs c", "b.values[0]"},
        {"listConnections -p c.values", "a.total"},
        {"listConnections b.scale", ""},
        {"listConnections -d a", "c"},
    });
    expectErrors({
        {"connectAttr a.total c.scale", "connected from 'a.rounded'"},
        {"connectAttr b.total c.values[9]", "the source depends on the destination"},
        {"connectAttr -force b.total c.scale", "the source depends on the destination"},
        {"connectAttr a.total nope.x", "there is no node named 'nope'"},
        {"connectAttr a.total", "argument 2 (text) is missing"},
        {"disconnectAttr b.total c.scale", "'b.total' is not connected to 'c.scale'"},
    });
    expectPrints({
        {"getAttr -multiIndices c.values", "2"},         // the refused element did not come into being
        {"listConnections -plugs c.scale", "a.rounded"}, // what was broken for a refused one is back
        {"connectAttr -force a.total c.scale; listConnections -plugs c.scale", "a.total"},
        {"connectAttr -force b.scale c.values[2]; listConnections -plugs "
         "c.values",
         "b.scale"}, // deletes when broken
        {"disconnectAttr a.total c.scale; listConnections -plugs c.scale", ""},
    });
}

TEST_F(GraphCommands, TimeAndDirtiness) {
    create("testSum", "n");
    print("connectAttr time1.outTime n.values[0]");
    expectPrints({
        {"currentTime", "1"},
        {"currentTime -12.5", "-12.5"},
        {"currentTime -query", "-12.5"},
        {"getAttr n.total", "-12.5"},
    });
    EXPECT_EQ(session.time(), -12.5);
    expectErrors({
        {"currentTime x", "currentTime: 'x' is not a finite number"},
        {"dgdirty nope", "dgdirty: there is no node 'nope'"},
        {"dgdirty n.values[8]", "'n.values[8]' does not exist"},
    });
    OpenQuarn::ComputeWatch computes;
    print("getAttr n.total");
    EXPECT_THAT(computes.plugs(), ElementsAre());
    print("dgdirty n; getAttr n.total");
    EXPECT_THAT(computes.plugs(), ElementsAre("n.total"));
    print("dgdirty n.scale; getAttr n.rounded");
    EXPECT_THAT(computes.plugs(), ElementsAre("n.total", "n.rounded"));
}

TEST_F(GraphCommands, TheWorkspace) {
    const TemporaryFolder folder;
    const std::string path = folder.path().string();
    expectPrints({
        {"workspace -rootDirectory '/a b'; workspace -q -rootDirectory", "/a b"},
        {"workspace -rd /c/; workspace -query -rd", "/c/"},
    });
    print("workspace -openWorkspace " + OpenQuarn::quotedWord(path));
    EXPECT_EQ(print("workspace -q -rootDirectory"), path + "/");
    EXPECT_EQ(OpenQuarn::Workspace::rootDirectory(), path + "/");
    expectErrors({
        {"workspace", "nothing is asked for"},
        {"workspace -q", "nothing is asked for"},
        {"workspace -openWorkspace /no/such/folder", "there is no folder '/no/such/folder'"},
        {"workspace -rootDirectory", "flag '-rootDirectory', argument 1 (text) is missing"},
    });
    OpenQuarn::Workspace::resetRootDirectory();
}

TEST_F(GraphCommands, TheSceneAndItsFile) {
    const TemporaryFolder folder;
    const std::string path = (folder.path() / "an arm.json").string();
    const std::string other = (folder.path() / "other.json").string();
    expectErrors({
        {"file", "one of -new, -open, -save and -saveAs is needed, and 0 are given"},
        {"file -new -save", "and 2 are given"},
        {"file -save", "the scene has no file yet"},
        {"file -open", "flag '-open', argument 1 (text) is missing"},
    });
    print("createNode testSum -name arm; setAttr arm.values 1 2");
    EXPECT_EQ(print("file -saveAs " + OpenQuarn::quotedWord(path)), path);
    print("setAttr arm.values 7; file -saveAs " + OpenQuarn::quotedWord(other));
    EXPECT_EQ(print("file -open " + OpenQuarn::quotedWord(path) + "; getAttr arm.total"), "3");
    EXPECT_EQ(print("setAttr arm.values 5; file -save"), path);
    expectPrints({
        {"file -new; ls", "time1"},
        {"file -query -sceneName", ""},
        {"createNode testSum -name kept", "kept"},
    });
    EXPECT_THAT(error("file -open " + OpenQuarn::quotedWord(path + "x")), HasSubstr(path + "x"));
    EXPECT_EQ(print("ls kept"), "kept");
    EXPECT_EQ(print("file -open " + OpenQuarn::quotedWord(path) + "; getAttr arm.total"), "7");
    EXPECT_EQ(print("file -query -sceneName"), path);
}

TEST_F(GraphCommands, DuplicateTakesValuesAndNoConnections) {
    create("testSum", "n");
    create("testSum", "up");
    print("setAttr up.values[0] 4; connectAttr up.total n.values[3]; setAttr "
          "n.values[7] 2; setAttr n.text 'a b'");
    expectPrints({
        {"duplicate n", "n1"},
        {"duplicate n -name copy", "copy"},
        {"getAttr copy.values", "4 2"},
        {"getAttr -multiIndices copy.values", "3 7"},
        {"getAttr copy.text", "a b"},
        {"getAttr copy.total", "6"},
        {"listConnections copy", ""},
        {"setAttr copy.text c; getAttr n.text", "a b"},
    });
    EXPECT_THAT(error("duplicate nope"), HasSubstr("there is no node 'nope'"));
    EXPECT_THAT(error("duplicate n -name 1a"), HasSubstr("'1a'"));
    EXPECT_EQ(print("ls -type testSum"), "n\nup\nn1\ncopy");
}

TEST_F(GraphCommands, DuplicateHasPluginsCopyTheirData) {
    fileNodes::registerTypes();
    create("fileNode", "h");
    const auto store = [](const char* name, const char* held) {
        EXPECT_EQ(text(plug(name).setHObject(fileNodes::makeData(held))), "");
    };
    const auto held = [](const char* name) { return fileNodes::textOf(plug(name).asHObject()); };
    store("h.datas[2]", "two");
    store("h.datas[5]", "five");
    EXPECT_EQ(print("duplicate h -name g"), "g");
    EXPECT_EQ(held("g.datas[2]"), "copy of two");
    EXPECT_EQ(held("g.datas[5]"), "copy of five");
    EXPECT_EQ(held("h.datas[2]"), "two");

    store("h.datas[5]", "unique");
    EXPECT_THAT(error("duplicate h"), HasSubstr("the data of 'h' cannot be copied"));
    EXPECT_THAT(takeMessages(), ElementsAre(HasSubstr("there is but one")));
    EXPECT_EQ(print("ls -type fileNode"), "h\ng"); // nothing half-made stays

    EXPECT_THAT(print("loadPlugin -query"), HasSubstr("fileNodes"));
    EXPECT_THAT(error("unloadPlugin fileNodes"), HasSubstr("unloadPlugin: "));
    print("deleteNode h g; unloadPlugin fileNodes");
    expectErrors({
        {"createNode fileNode", "there is no node type 'fileNode'"},
        {"unloadPlugin fileNodes", "fileNodes"},
        {"loadPlugin /no/such/plugin.so", "/no/such/plugin.so"},
        {"loadPlugin", "argument 1 (text) is missing"},
    });
}

TEST_F(GraphCommands, MeshInfoGivesSizeAndDistance) {
    const auto makeMesh = [](const std::string& name, const HPointArray& points) {
        HFnMeshData mesh;
        mesh.create(points, HIntArray{3}, HIntArray{0, 1, 2});
        create("mesh", name);
        EXPECT_EQ(text(plug(name + ".inMesh").setHObject(mesh.object())), "");
    };
    makeMesh("a", {HPoint(0, 0, 0), HPoint(1, 0, 0), HPoint(0, -2, 0.5)});
    makeMesh("b", {HPoint(0, 0, 0), HPoint(1, 3, 4), HPoint(0, -2, 1.5)});
    makeMesh("larger", HPointArray(4));
    create("mesh", "hollow");
    expectPrints({
        {"meshInfo a.outMesh", "3 vertices, 1 polygon, from 0 -2 0 to 1 0 0.5"},
        {"meshInfo -to b.outMesh a.outMesh", "mean distance 2, largest 5 at vertex 1"},
    });
    expectErrors({
        {"meshInfo -to larger.outMesh a.outMesh", "3 vertices"},
        {"meshInfo hollow.outMesh", "'hollow.outMesh' holds no mesh"},
        {"meshInfo time1.outTime", "'time1.outTime' holds no mesh"},
    });
}

TEST_F(GraphCommands, ArgumentsNameNodesAndPlugs) {
    const HObject node = create("testSum", "n");
    HSyntax syntax;
    syntax.addArg(HSyntax::kString);
    const auto lookUp = [&](const char* name, HSelectionList& list) {
        HArgList words;
        words.addArg(name);
        return HArgDatabase(syntax, words).getCommandArgument(0, list);
    };
    HSelectionList list;
    HObject found;
    HPlug foundPlug;
    EXPECT_EQ(text(lookUp("n", list)), "");
    EXPECT_FALSE(list.getDependNode(0, found).error());
    EXPECT_TRUE(found == node);
    EXPECT_EQ(text(lookUp("n.values[3]", list)), "");
    EXPECT_EQ(list.length(), 1U);
    EXPECT_FALSE(list.getPlug(0, foundPlug).error());
    EXPECT_EQ(foundPlug.name(), "n.values[3]");
    for (const char* nothing : {"nope", "*", "nope.x", "n.nope", ""})
        EXPECT_EQ(lookUp(nothing, list), HStatus::kFailure) << nothing;
    EXPECT_FALSE(list.getPlug(0, foundPlug).error()); // left alone
    EXPECT_EQ(HArgDatabase(syntax, HArgList()).getCommandArgument(0, list), HStatus::kFailure);
}

} // namespace
