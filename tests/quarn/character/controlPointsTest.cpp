// SPDX-License-Identifier: Apache-2.0
// The vertices of FBX and Collada files as the modelling tool counts them.
#include "quarn/character/characterFiles.h"
#include "quarn/character/colladaMeshes.h"
#include "quarn/character/fbxMeshes.h"
#include "storage/byteOrder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

#include <zlib.h>

namespace quarn {
namespace {

using testing::AllOf;
using testing::Each;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Lt;
using testing::SizeIs;

// two squares side by side, of two materials, and a line at their back; numbered without order
const std::vector<double> places = {1, 1, 0, 0, 0, 0, 2, 1, 0, 1, 0, 0.1, 0, 1, 0, 2, 0, 0.5};
const std::vector<std::int32_t> indices = {1, 3, 0, ~4, 3, 5, 2, ~0, 4, ~2};
const std::vector<std::uint32_t> corners = {1, 3, 0, 4, 3, 5, 2, 0, 4, 2};

template <class Numbers>
std::string joined(const Numbers& numbers, const char* between) {
    std::ostringstream text;
    for (std::size_t i = 0; i < numbers.size(); ++i)
        text << (i > 0 ? between : "") << numbers[i];
    return text.str();
}

std::string fbxText() {
    return "; FBX 7.4.0 project file \" {\nFBXHeaderExtension: {\n\tFBXVersion: 7400\n}\nDefinitions: { Count: 0 }\n"
           "Objects: {\n Geometry: 9, \"Geometry::{smile\", \"Shape\" { Vertices: *3 { a: 0,0,1 } }\n"
           " Geometry: 10, \"Geometry::strip\", \"Mesh\" {\n  Vertices: *18 {\n   a: " +
           joined(places, ",\n") + "\n  }\n  PolygonVertexIndex: *10 {\n   a: " + joined(indices, ",") +
           "\n  }\n  LayerElementMaterial: 0 { MappingInformationType: \"ByPolygon\"\n"
           "   ReferenceInformationType: \"IndexToDirect\"\n   Materials: *3 { a: 0,1,0 } }\n"
           "  Layer: 0 { LayerElement: { Type: \"LayerElementMaterial\"\n TypedIndex: 0 } }\n }\n"
           " Model: 20, \"Model::strip\", \"Mesh\" { Properties70: { P: \"GeometricTranslation\", \"Vector3D\", "
           "\"Vector\", \"\",5,6,7 } }\n Material: 30, \"Material::a\", \"\" { }\n Material: 31, \"Material::b\", \"\" "
           "{ }\n}\nConnections: { C: \"OO\",20,0\n C: \"OO\",10,20\n C: \"OO\",30,20\n C: \"OO\",31,20\n}\n";
}

/// The geometry of the above in the binary form.
struct FbxBinary {
    bool isWide = false, isPacked = false;
    std::string bytes = std::string("FBX binary with a name ") + '\0';

    void number(std::uint64_t value) {
        isWide ? storage::putLittle(bytes, value) : storage::putLittle(bytes, static_cast<std::uint32_t>(value));
    }
    template <class Within>
    void record(const std::string& name, const std::string& values, Within within) {
        const std::size_t at = bytes.size();
        number(0);
        number(1);
        number(values.size());
        bytes += static_cast<char>(name.size()) + name + values;
        within();
        const std::uint64_t end = bytes.size();
        bytes.replace(at, isWide ? 8 : 4, reinterpret_cast<const char*>(&end), isWide ? 8 : 4);
    }
    template <class Number>
    void array(const std::string& name, char type, const std::vector<Number>& numbers) {
        std::string data(reinterpret_cast<const char*>(numbers.data()), numbers.size() * sizeof(Number));
        if (isPacked) {
            uLongf size = compressBound(data.size());
            std::string packed(size, '\0');
            compress(reinterpret_cast<Bytef*>(packed.data()), &size, reinterpret_cast<const Bytef*>(data.data()),
                     data.size());
            data = packed.substr(0, size);
        }
        std::string value(1, type);
        for (const std::size_t head : {numbers.size(), std::size_t{isPacked}, data.size()})
            storage::putLittle(value, static_cast<std::uint32_t>(head));
        record(name, value + data, [] {});
    }
    std::string write() {
        bytes.resize(23);
        storage::putLittle(bytes, isWide ? 7500U : 7400U);
        record("Definitions", "", [&] { record("Geometry", "", [] {}); });
        record("Objects", "", [&] {
            record("Geometry", "Smiddle", [&] {
                array("Vertices", 'd', places);
                array("PolygonVertexIndex", 'i', indices);
                bytes.append(isWide ? 25 : 13, '\0');
            });
        });
        return bytes.append(isWide ? 25 : 13, '\0') + "and what comes behind";
    }
};

std::string collada(const std::string& polygons) {
    return "<COLLADA version=\"1.4.1\"><library_geometries><geometry id=\"g\"><mesh><source id=\"s\">"
           "<float_array id=\"f\" count=\"18\">" +
           joined(places, " \n") +
           "</float_array><technique_common><accessor source=\"#f\" count=\"6\" stride=\"3\"><param name=\"X\" "
           "type=\"float\"/><param name=\"Y\" type=\"float\"/><param name=\"Z\" type=\"float\"/></accessor>"
           "</technique_common></source><vertices id=\"v\"><input semantic=\"POSITION\" source=\"#s\"/></vertices>" +
           polygons +
           "</mesh></geometry></library_geometries><library_visual_scenes><visual_scene id=\"w\"><node id=\"strip\" "
           "name=\"strip\"><instance_geometry url=\"#g\"/></node></visual_scene></library_visual_scenes><scene>"
           "<instance_visual_scene url=\"#w\"/></scene></COLLADA>";
}

const std::string input = "<input semantic=\"VERTEX\" source=\"#v\" offset=\"0\"/>";
const std::string squares = "<polylist count=\"2\">" + input + "<vcount>4 4</vcount><p>1 3 0 4 3 5 2 0</p></polylist>";

TEST(ControlPoints, AreReadFromEveryForm) {
    std::vector<std::string> files = {fbxText()};
    for (const bool isWide : {false, true})
        for (const bool isPacked : {false, true})
            files.push_back(FbxBinary{isWide, isPacked}.write());
    for (const std::string& file : files) {
        SCOPED_TRACE(&file - files.data());
        const std::vector<ControlMesh> meshes = readFbxMeshes(file);
        ASSERT_THAT(meshes, SizeIs(1));
        EXPECT_EQ(meshes[0].points, places);
        EXPECT_THAT(meshes[0].polygonSizes, ElementsAre(4, 4, 2));
        EXPECT_EQ(meshes[0].corners, corners);
    }
    const std::string normals = "<input semantic=\"NORMAL\" offset=\"0\" source=\"#n\"/>"
                                "<input semantic=\"VERTEX\" source=\"#v\" offset=\"2\"/>";
    const struct {
        std::string polygons;
        std::vector<std::uint32_t> sizes, corners;
    } elements[] = {
        {squares, {4, 4}, {1, 3, 0, 4, 3, 5, 2, 0}},
        {"<triangles>" + normals + "<p>9 9 1 9 9 3 9 9 0</p></triangles>", {3}, {1, 3, 0}},
        {"<polygons>" + input + "<p>1 3 0</p><p>3 5 2 0</p></polygons><lines>" + input + "<p>4 2</p></lines>",
         {3, 4, 2},
         {1, 3, 0, 3, 5, 2, 0, 4, 2}},
    };
    for (const auto& element : elements) {
        const std::vector<ControlMesh> meshes = readColladaMeshes(collada(element.polygons));
        ASSERT_THAT(meshes, SizeIs(1));
        EXPECT_EQ(meshes[0].points, places);
        EXPECT_EQ(meshes[0].polygonSizes, element.sizes);
        EXPECT_EQ(meshes[0].corners, element.corners);
    }
    EXPECT_THAT(readColladaMeshes(collada("<tristrips>" + input + "<p>1 3 0</p></tristrips>")), IsEmpty());
}

// every file that is cut off, and every byte that is another
TEST(ControlPoints, DamageDoesNoHarm) {
    const auto harmless = [](auto readMeshes, const std::string& bytes) {
        try {
            for (const ControlMesh& mesh : readMeshes(bytes))
                EXPECT_THAT(mesh.corners, Each(Lt(mesh.points.size() / 3)));
        } catch (const std::runtime_error&) {
            return; // as it should be
        }
    };
    const auto damage = [&](auto readMeshes, const std::string& sound) {
        for (std::size_t at = 0; at < sound.size(); ++at) {
            harmless(readMeshes, std::string(sound.data(), at)); // of exact size, for the sanitizer
            for (const int change : {1, 2, 8, 128, 255}) {
                std::string changed = sound;
                changed[at] = static_cast<char>(changed[at] ^ change);
                harmless(readMeshes, changed);
            }
        }
    };
    damage(readFbxMeshes, fbxText());
    for (const bool isWide : {false, true})
        damage(readFbxMeshes, FbxBinary{isWide, isWide}.write());
    damage(readColladaMeshes, collada(squares));
}

TEST(ControlPoints, DamageIsRefusedWithTheReason) {
    const std::string packed = FbxBinary{false, true}.write();
    const std::string plain = FbxBinary{}.write();
    const struct {
        std::string sound, what, by, reason;
    } damages[] = {
        {fbxText(), "a: 1,3,0,-5", "a: 1,3,6,-5", "a polygon has control point 6 of 6"},
        {fbxText(), ",4,-3", ",4,2", "the last polygon does not end"},
        {fbxText(), "a: 1,3,0,-5", "a: 1,3,x0,-5", "\"x0\" stands where a number should"},
        {fbxText(), "C: \"OO\",31,20\n}", "C: \"OO\",31,20\n", "it ends within braces"},
        {plain, std::string("d\x12\0\0\0", 5), std::string("d\x12\0\0\x70", 5),
         "Vertices has another size than it says"},
        {packed, std::string("d\x12\0\0\0", 5), std::string("d\x12\0\0\x70", 5), " packed bytes cannot be 15032385680"},
        {packed, std::string("d\x12\0\0\0", 5), std::string("d\x13\0\0\0", 5),
         "packed bytes are damaged, or are not 152"},
        {plain,
         "\x08"
         "Vertices",
         "\xf8"
         "Vertices",
         "its records are damaged: the one at byte "},
        {collada(squares), "<p>1", "<p>6", "has vertex 6 of 6"},
        {collada(squares), "count=\"6\"", "count=\"7\"", "18 numbers, too few for 7 positions"},
        {collada(squares), "stride=\"3\"", "stride=\"4294967295\"", "too few for 6 positions"},
        {collada(squares), "4 4<", "4 5<", "counts 9 corners, and has 8"},
        {collada(squares), "</COLLADA>", "", "at byte "},
    };
    for (const auto& [sound, what, by, reason] : damages) {
        SCOPED_TRACE(reason);
        std::string changed = sound;
        ASSERT_NE(changed.find(what), std::string::npos);
        changed.replace(changed.find(what), what.size(), by);
        EXPECT_THAT(failureOf([&, &sound = sound] {
                        sound.starts_with('<') ? readColladaMeshes(changed) : readFbxMeshes(changed);
                    }),
                    HasSubstr(reason));
    }
}

// where every control point is in the scene is where it is in the file
void expectControlPoints(const CharacterMesh& mesh) {
    EXPECT_EQ(mesh.fileOrder, FileOrder::controlPoints);
    ASSERT_THAT(mesh.joinedOf, SizeIs(6));
    for (std::size_t i = 0; i < 6; ++i)
        EXPECT_TRUE(mesh.points[mesh.joinedOf[i]].isEquivalent(
            HPoint(places[3 * i], places[3 * i + 1], places[3 * i + 2]), 1e-6))
            << i;
}

TEST(ControlPoints, AreTheFilesOrder) {
    const CharacterMesh parts = readBytesAs("strip.fbx", fbxText()).meshes.at(0);
    EXPECT_THAT(parts.polygonSizes, ElementsAre(4, 4));
    expectControlPoints(parts);
    expectControlPoints(readBytesAs("strip.dae", collada(squares)).meshes.at(0));
}

TEST(ControlPoints, ThatCannotBeCountedLeaveTheCornersWithTheReason) {
    const std::string triangles = "<triangles count=\"1\">" + input + "<p>1 3 0</p></triangles>";
    const std::string strips = "<tristrips count=\"1\">" + input + "<p>1 3 0 4</p></tristrips>";
    const struct {
        std::string polygons;
        std::size_t corners;
        const char* reason;
    } files[] = {
        {triangles, 3, "has control points that are in no polygon, 3 of them, such as 2"},
        {strips, 6, "has the polygons of none of the file's geometries"},
    };
    for (const auto& file : files) {
        const Character character = readBytesAs("strip.dae", collada(file.polygons));
        EXPECT_EQ(character.meshes.at(0).fileOrder, FileOrder::corners);
        EXPECT_THAT(character.meshes[0].joinedOf, SizeIs(file.corners));
        EXPECT_THAT(character.warnings,
                    testing::Contains(AllOf(HasSubstr("the mesh \"strip\" "), HasSubstr(file.reason))));
    }
}

} // namespace
} // namespace quarn
