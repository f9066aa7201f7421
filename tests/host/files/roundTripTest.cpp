// SPDX-License-Identifier: Apache-2.0
// What is saved comes back bit by bit.
#include "host/files/FileTest.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnData.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnMesh.h"
#include "openquarn/HFnMeshData.h"
#include "openquarn/HMatrix.h"

#include <bit>
#include <cmath>
#include <cstdint>
#include <iomanip>
#include <limits>
#include <random>
#include <sstream>

namespace {

using namespace fileNodes;
using Random = std::mt19937;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using testNodes::connect;
using testNodes::plug;

std::string bits(double value) {
    std::ostringstream text;
    text << std::hex << std::bit_cast<std::uint64_t>(value);
    return text.str();
}

std::string meshText(const HObject& object) {
    std::ostringstream text;
    const HFnMesh mesh(object);
    HPointArray points;
    mesh.getPoints(points);
    for (const HPoint& point : points)
        text << bits(point.x) << ' ' << bits(point.y) << ' ' << bits(point.z) << ' ';
    HIntArray vertices;
    for (int polygon = 0; !mesh.getPolygonVertices(polygon, vertices).error(); ++polygon)
        text << ::testing::PrintToString(std::vector<int>(vertices.begin(), vertices.end()));
    HFloatArray us, vs;
    HIntArray corners;
    mesh.getUVs(us, vs, corners);
    for (unsigned uv = 0; uv < us.length(); ++uv)
        text << std::bit_cast<std::uint32_t>(us[uv]) << ' ' << std::bit_cast<std::uint32_t>(vs[uv]) << ' ';
    text << ::testing::PrintToString(std::vector<int>(corners.begin(), corners.end()));
    const HFnGeometryData geometry(object);
    HStringArray tags;
    geometry.getComponentTags(tags);
    HUintArray tagged;
    for (const HString& tag : tags) {
        geometry.getComponentTag(tag, tagged);
        text << tag.asChar() << ::testing::PrintToString(std::vector<unsigned>(tagged.begin(), tagged.end()));
    }
    return text.str();
}

std::string dataText(const HObject& object) {
    std::ostringstream text;
    if (object.hasFn(HFn::kStringData))
        text << '"' << HFnStringData(object).string().asStdString() << '"';
    if (object.hasFn(HFn::kDoubleArrayData))
        for (const double value : HFnDoubleArrayData(object).values())
            text << bits(value) << ' ';
    if (object.hasFn(HFn::kMatrixData))
        for (unsigned i = 0; i < 16; ++i)
            text << bits(HFnMatrixData(object).matrix()[i / 4][i % 4]) << ' ';
    if (object.hasFn(HFn::kMeshData))
        text << meshText(object);
    return object.hasFn(HFn::kPluginData) ? textOf(object) : object.isNull() ? "null" : text.str();
}

/// Everything in a plug: elements, children, bits, locks and sources.
void dump(const HPlug& at, std::ostream& text) {
    const HFnAttribute attribute(at.attribute());
    if (!attribute.isStorable() && attribute.isWritable())
        return;
    text << at.name().asChar() << (at.isLocked() ? " locked" : "") << " <- " << at.source().name().asChar();
    HPlugArray destinations;
    at.destinations(destinations);
    for (const HPlug& destination : destinations)
        text << " -> " << destination.name().asChar();
    std::vector<unsigned> indices;
    if (at.isArray())
        at.getExistingArrayAttributeIndices(indices);
    const HObject object = at.attribute();
    if (!at.isArray() && (object.hasFn(HFn::kNumericAttribute) || object.hasFn(HFn::kEnumAttribute)))
        text << ' ' << bits(at.asDouble());
    if (!at.isArray() && (object.hasFn(HFn::kTypedAttribute) || object.hasFn(HFn::kMatrixAttribute)))
        text << ' ' << dataText(at.asHObject());
    text << '\n';
    for (const unsigned index : indices)
        dump(at.elementByLogicalIndex(index), text);
    if (!at.isArray() && at.isCompound())
        for (unsigned i = 0; i < at.numChildren(); ++i)
            dump(at.child(i), text);
}

std::string dumpScene(const OpenQuarn::Session& session) {
    std::ostringstream text;
    text << bits(session.time()) << '\n';
    for (const HObject& object : session.nodes()) {
        const HFnDependencyNode node(object);
        text << node.typeName().asChar() << ' ' << node.name().asChar() << '\n';
        for (unsigned i = 0; i < node.attributeCount(); ++i)
            dump(HPlug(object, node.attribute(i)), text);
    }
    return text.str();
}

// --- random scenes ---

unsigned below(Random& random, unsigned limit) {
    return static_cast<unsigned>(random() % limit);
}

// Numbers of meshes may be anything; where a plug is set, they are finite.
double anyCoordinate(Random& random) {
    constexpr double special[] = {0.0,
                                  -0.0,
                                  1.0,
                                  0.1,
                                  1e15,
                                  123456789012345680.0,
                                  9007199254740993.0,
                                  1e22,
                                  1e23,
                                  5e-324,
                                  2.2250738585072011e-308,
                                  1.7976931348623157e308};
    const auto anyBits = std::bit_cast<double>((std::uint64_t{random()} << 32U) | random());
    switch (below(random, 4)) {
    case 0:
        return special[below(random, std::size(special))];
    case 1:
        return static_cast<double>(static_cast<int>(random()));
    case 2:
        return std::isfinite(anyBits) || below(random, 2) == 0 ? anyBits : std::copysign(HUGE_VAL, anyBits);
    default:
        return std::ldexp(static_cast<double>(random()), -static_cast<int>(below(random, 1200)));
    }
}

double anyDouble(Random& random) {
    const double value = anyCoordinate(random);
    return std::isfinite(value) ? value : 0.25;
}

float anyFloat(Random& random) {
    const auto value = std::bit_cast<float>(static_cast<std::uint32_t>(random()));
    return below(random, 2) == 0 && std::isfinite(value) ? value : static_cast<float>(below(random, 1000)) / 10.0F;
}

HString anyText(Random& random) {
    const char* texts[] = {"", "plain", "\"quoted\" \\ / \n\t\x01", "gr\xc3\xbc\xc3\x9f", "\xff\xfe not UTF-8", "nan"};
    std::string text = texts[below(random, std::size(texts))];
    if (below(random, 4) == 0)
        text += std::string("\0nul", 4);
    return HString(text);
}

HMatrix anyMatrix(Random& random) {
    HMatrix matrix;
    for (unsigned i = 0; i < 16; ++i)
        matrix[i / 4][i % 4] = anyDouble(random);
    return matrix;
}

HObject anyMesh(Random& random) {
    HPointArray points;
    for (unsigned i = 0; i < 6; ++i)
        points.append(HPoint(anyCoordinate(random), anyCoordinate(random), anyCoordinate(random)));
    HFnMeshData mesh;
    if (below(random, 3) == 0)
        mesh.create(points, {}, {});
    else
        mesh.create(points, {3, 5}, {0, 1, 2, 5, 4, 3, 2, 1});
    if (below(random, 2) == 0)
        mesh.setComponentTag("shuffled", {5, 0, 3});
    HFnMesh textured(mesh.object());
    if (below(random, 2) == 0) // refused by those without polygons
        textured.setUVs({anyFloat(random), 0.1F}, {anyFloat(random), anyFloat(random)}, {0, 1, 0, 1, 1, 0, 0, 1});
    return textured.object();
}

unsigned anyIndex(Random& random) {
    return below(random, 5) == 0 ? std::numeric_limits<unsigned>::max() - below(random, 3) : below(random, 12);
}

void setNumbers(const std::string& node, Random& random) {
    plug(node + ".yes").setBool(below(random, 2) == 0);
    plug(node + ".small").setShort(static_cast<short>(random()));
    plug(node + ".whole").setInt(static_cast<int>(random()));
    plug(node + ".choice").setShort(static_cast<short>(below(random, 3)));
    plug(node + ".single").setFloat(anyFloat(random));
    for (const char* name : {".real", ".unusual"})
        plug(node + name).setDouble(anyDouble(random));
}

void setData(const std::string& node, Random& random) {
    plug(node + ".word").setString(anyText(random));
    if (below(random, 3) == 0)
        plug(node + ".word").setHObject(HObject::kNullObj);
    plug(node + ".matrix").setMatrix(anyMatrix(random));
    plug(node + ".list").setHObject(HFnDoubleArrayData().create({anyDouble(random), anyDouble(random)}));
    plug(node + ".mesh").setHObject(anyMesh(random));
    plug(node + ".data").setHObject(makeData(anyText(random).asStdString()));
}

void setElement(const std::string& node, Random& random) {
    const std::string index = "[" + std::to_string(anyIndex(random)) + "]";
    plug(node + ".weights" + index).setDouble(anyDouble(random));
    plug(node + ".singles" + index).setFloat(anyFloat(random));
    plug(node + ".words" + index).setString(anyText(random));
    plug(node + ".matrices" + index).setMatrix(anyMatrix(random));
    plug(node + ".datas" + index).setHObject(makeData("some"));
    plug(node + ".state" + index).setDouble(1.0);
    const std::string group = node + ".groups[" + std::to_string(anyIndex(random)) + "]";
    plug(group + ".title").setString(anyText(random));
    plug(group + ".items" + index).setDouble(anyDouble(random));
    plug(group + ".spot.y").setDouble(below(random, 2) == 0 ? 0.0 : anyDouble(random));
}

// A node that takes values from earlier ones, so that there is no cycle.
void connectNode(const std::string& node, const std::string& earlier, Random& random) {
    const std::string index = "[" + std::to_string(20 + below(random, 3)) + "]";
    connect(earlier + ".out", node + ".weights" + index);
    connect(earlier + ".message", node + ".messages" + index);
    connect(earlier + ".groups[40]", node + ".groups" + index);
    if (below(random, 2) == 0)
        connect("time1.outTime", node + ".real");
    if (below(random, 3) == 0)
        connect(earlier + ".weights", node + ".copied");
    if (below(random, 3) == 0)
        plug(node + ".whole").setLocked(true);
}

void fillScene(OpenQuarn::Session& session, unsigned seed) {
    Random random(seed);
    session.newScene();
    session.setTime(std::ldexp(static_cast<double>(random()), -20));
    constexpr unsigned count = 8;
    for (unsigned i = 0; i < count; ++i) {
        const std::string name = "n" + std::to_string(i);
        create(name);
        setNumbers(name, random);
        setData(name, random);
        for (unsigned elements = below(random, 6); elements > 0; --elements)
            setElement(name, random);
        if (i > 0)
            connectNode(name, "n" + std::to_string(below(random, i)), random);
    }
}

class RoundTrip : public FileTest {};

TEST_F(RoundTrip, RandomScenesComeBackWithEveryBit) {
    for (unsigned seed = 1; seed <= 40; ++seed) {
        SCOPED_TRACE(seed);
        fillScene(session, seed);
        const std::string scene = dumpScene(session); // evaluates
        const std::string text = saved();
        session.newScene();
        ASSERT_THAT(read(text), IsEmpty());
        ASSERT_EQ(dumpScene(session), scene);
        ASSERT_EQ(saved(), text);
    }
}

TEST_F(RoundTrip, AFreshNodeIsItsNameAndWhatItsConstructorSet) {
    create("one");
    create("two");
    connect("one.out", "two.real");
    plug("two.weights[3]").setDouble(1.5);
    plug("two.weights[4]").setDouble(0.0);
    plug("two.weights[9]").setDouble(-0.0);
    plug("two.groups[2].title").setString("x");
    plug("two.groups[2].title").setHObject(HObject::kNullObj);
    plug("two.single").setFloat(0.3F);
    plug("two.single").setLocked(true);
    EXPECT_EQ(saved(), R"({
"openquarnScene":1,
"writtenBy":"OpenQuarn",
"time":1,
"plugins":["fileNodes"],
"nodes":[
{"name":"time1","type":"time","typeId":1330708482},
{"name":"one","type":"fileNode","typeId":2119630865,"plugin":"fileNodes","values":{"word":"made"}},
{"name":"two","type":"fileNode","typeId":2119630865,"plugin":"fileNodes","values":{"single":0.3,"weights":{"3":[1.5,0],"9":[-0.0]},"word":"made","groups[2]":{}},"locked":["single"]}
],
"connections":[
["one.out","two.real"]
]
}
)");
}

TEST_F(RoundTrip, NodesThatAreReadKeepWhatTheFileSays) {
    create("one");
    plug("one.word").setString(""); // its default again, so not in the file
    const std::string text = saved();
    ASSERT_THAT(read(text), IsEmpty());
    EXPECT_TRUE(plug("one.word").asString().isEmpty());
}

TEST_F(RoundTrip, DataThatItsPluginCannotWriteIsReported) {
    create("one");
    plug("one.data").setHObject(makeData("shy"));
    std::string text;
    const OpenQuarn::FileOutcome outcome = OpenQuarn::sceneToText(text);
    EXPECT_TRUE(outcome);
    EXPECT_THAT(outcome.warnings, ::testing::ElementsAre(HasSubstr("'one.data' could not be written by its data type: "
                                                                   "the data is shy")));
    EXPECT_EQ(takeMessages(), outcome.warnings);
    EXPECT_THAT(text, ::testing::Not(HasSubstr("\"data\"")));
}

} // namespace
