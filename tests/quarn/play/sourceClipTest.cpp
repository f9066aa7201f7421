// SPDX-License-Identifier: Apache-2.0
// A motion in the character's own file: read again, it is the motion, whatever the file had, and nothing else is lost.
#include "openquarn_app/Session.h"
#include "quarn/character/characterFiles.h"
#include "quarn/character/gltfContainer.h"
#include "quarn/character/readCharacter.h"
#include "quarn/import/ImportTest.h"
#include "quarn/import/importCharacter.h"
#include "quarn/play/ClipSource.h"
#include "quarn/play/FrameFiles.h"
#include "quarn/play/JointTracks.h"
#include "quarn/play/beforeSkin.h"
#include "quarn/play/fitInSkin.h"
#include "support/TemporaryFolder.h"

#include <algorithm>
#include <cmath>
#include <fstream>
#include <random>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;

constexpr std::size_t stripVertices = 6; // as they are joined
constexpr int lastFrame = 4;

using Motion = std::vector<std::vector<float>>;

Motion anyMotion() {
    std::mt19937 random(3);
    std::uniform_real_distribution<float> place(-2.0F, 2.0F);
    Motion motion(lastFrame, std::vector<float>(3 * stripVertices));
    for (std::vector<float>& frame : motion)
        for (float& value : frame)
            value = place(random);
    return motion;
}

class SourceClipTest : public testing::Test {
protected:
    SourceClipTest() { findDeformer(); }

    fs::path path(const std::string& name) const { return folder_.path() / name; }

    // imports a file of these bytes, and puts the motion into it
    std::vector<std::string> write(const std::string& name, const std::string& bytes, const Motion& motion,
                                   std::optional<double> error = {}) {
        std::ofstream(path(name), std::ios::binary) << bytes;
        ImportOptions options;
        options.file = path(name);
        options.output = path("scene.json");
        importCharacter(options);
        SceneSession session;
        session.open(path("scene.json"));
        const HObject mesh = findNode("arm");
        FrameWriting writing;
        writing.frames = {1, lastFrame, 1};
        writing.allowedError = error;
        writing.source = findClipSource(mesh, stripVertices);
        FrameFiles files(path("clip.glb"), polygonsOf(plugOf(mesh, "outMesh")), std::move(writing));
        for (int frame = 1; frame <= lastFrame; ++frame) {
            session.host().setTime(frame);
            files.add(frame, motion[static_cast<std::size_t>(frame) - 1]);
        }
        files.finish();
        shapes_ = files.shapes();
        return files.notes();
    }

    // how far the mesh of the clip is off, at most, as a plain reader has it
    double errorOfClip(const Motion& motion) const {
        const Character clip = readCharacter(path("clip.glb"));
        const Character before = readCharacter(path("scene.json").replace_extension(ending_));
        double error = 0.0;
        for (std::size_t frame = 0; frame < motion.size(); ++frame) {
            CharacterMesh mesh = clip.meshes.at(0);
            for (const MorphChannel& channel : clip.animations.at(0).morphs)
                addTarget(mesh, channel,
                          channel.mesh == 0 ? std::clamp(channel.weight.keys.at(frame).value, 0.0, 1.0) : 0.0);
            const std::vector<HMatrix> worlds = plainWorlds(clip, static_cast<double>(frame) / 24.0);
            for (std::size_t v = 0; v < mesh.joinedOf.size(); ++v) {
                const HPoint point = plainPoint(mesh, worlds, mesh.joinedOf[v]);
                const float* wanted = &motion[frame][3 * std::size_t{before.meshes.at(0).joinedOf[v]}];
                error = std::max(error, std::hypot(point.x - static_cast<double>(wanted[0]),
                                                   point.y - static_cast<double>(wanted[1]),
                                                   point.z - static_cast<double>(wanted[2])));
            }
        }
        return error;
    }

    std::string ending_ = ".gltf"; ///< of the character, which is called like the scene
    std::optional<ShapesOfMotion> shapes_;

private:
    static void addTarget(CharacterMesh& mesh, const MorphChannel& channel, double weight) {
        if (channel.mesh != 0)
            return;
        const MorphTarget& target = mesh.morphTargets.at(channel.target);
        for (std::size_t i = 0; i < target.vertices.size(); ++i) {
            HPoint& point = mesh.points[target.vertices[i]];
            const HVector delta = target.deltas[i] * weight;
            point = HPoint(point.x + delta.x, point.y + delta.y, point.z + delta.z);
        }
    }

    TemporaryFolder folder_;
};

std::string sampled(GltfWriter& file, const std::string& type, const std::vector<float>& values) {
    const std::size_t times = file.floats("SCALAR", {0, 0.125F});
    return R"({"input":)" + std::to_string(times) + ",\"output\":" + std::to_string(file.floats(type, values)) + "}";
}

// "lower" turns and "upper" moves; a prop that the clip leaves alone spins
void animate(GltfWriter& file) {
    file.nodes.push_back(R"({"name":"prop"})");
    file.roots += "," + std::to_string(file.nodes.size() - 1);
    const std::string turn = sampled(file, "VEC4", {0, 0, 0, 1, 0, 0.6F, 0, 0.8F});
    file.animations = {R"({"name":"wave","samplers":[)" + turn + "," + sampled(file, "VEC3", {0, 0, 0, 1, 2, 3}) +
                       R"(],"channels":[{"sampler":0,"target":{"node":1,"path":"rotation"}},
        {"sampler":1,"target":{"node":0,"path":"translation"}},{"sampler":0,"target":{"node":)" +
                       std::to_string(file.nodes.size() - 1) + R"(,"path":"rotation"}}]})"};
}

void quantize(GltfWriter& file) {
    std::vector<std::int16_t> points;
    for (const float value : stripPoints())
        points.push_back(static_cast<std::int16_t>(value * 10000.0F));
    file.replace("POSITION", file.values("VEC3", 5122, points, R"(,"normalized":true)"));
    file.more = R"(,"extensionsUsed":["KHR_mesh_quantization"],"extensionsRequired":["KHR_mesh_quantization"])";
}

// a target of its own, of which the animation asks too much, and a second node that shows the mesh
void addMorph(GltfWriter& file) {
    animate(file);
    std::vector<float> deltas(24, 0.0F);
    deltas[5] = deltas[14] = 0.5F; // on both sides of the seam
    const std::string& mesh = file.meshes[0];
    file.meshes[0] = mesh.substr(0, mesh.size() - 3) + R"(,"targets":[{"POSITION":)" +
                     std::to_string(file.floats("VEC3", deltas)) + R"(}]}],"weights":[0.25]})";
    file.nodes.push_back(R"({"name":"other","mesh":0,"skin":0})");
    file.roots += "," + std::to_string(file.nodes.size() - 1);
    file.animations.push_back(R"({"name":"face","samplers":[)" + sampled(file, "SCALAR", {0, 3}) +
                              R"(],"channels":[{"sampler":0,"target":{"node":2,"path":"weights"}}]})");
}

TEST_F(SourceClipTest, IsTheMotionWhateverTheFileHas) {
    struct Case {
        const char* what;
        std::function<void(Strip&)> change;
        const char* note;
    };
    const Case cases[] = {{"a plain strip", [](Strip& strip) { strip.more = animate; }, "keeps 1 of its 3 tracks"},
                          {"a scaled joint below a matrix with shear",
                           [](Strip& strip) {
                               strip.more = animate;
                               strip.upper =
                                   R"({"name":"upper","children":[1],"matrix":[2,0,0,0,0.3,1,0,0,0,0,-1,0,1,2,3,1]})";
                               strip.lower = R"({"name":"lower","translation":[1,0,0],"scale":[0.5,2,1]})";
                           },
                           "keeps 1 of its 3 tracks"},
                          {"a node with a place, and joints of one name",
                           [](Strip& strip) {
                               strip.upper = R"({"name":"a b","children":[1]})";
                               strip.lower = R"({"name":"a_b","translation":[1,0,0]})";
                               strip.mesh = R"({"name":"arm","mesh":0,"skin":0,"translation":[9,9,9]})";
                           },
                           ""},
                          {"positions in whole numbers", [](Strip& strip) { strip.more = quantize; }, ""},
                          {"targets, and two nodes that show them", [](Strip& strip) { strip.more = addMorph; },
                           "the animation \"wave\" (animations[0]) keeps"},
                          {"a target of which more is asked than there is",
                           [](Strip& strip) {
                               strip.more = [](GltfWriter& file) {
                                   addMorph(file);
                                   file.animations.erase(file.animations.begin());
                               };
                           },
                           "the animation \"face\" (animations[0])"}};
    const Motion motion = anyMotion();
    for (const Case& each : cases)
        for (const char* ending : {".gltf", ".glb"}) {
            SCOPED_TRACE(std::string(each.what) + ending);
            Strip strip;
            each.change(strip);
            const GltfWriter file = strip.write();
            ending_ = ending;
            const auto notes = write("scene" + ending_, ending_ == ".glb" ? file.binary() : file.text(), motion);
            EXPECT_LT(errorOfClip(motion), 5e-6);
            EXPECT_EQ(notes.empty(), std::string(each.note).empty());
            EXPECT_THAT(notes.empty() ? "" : notes.front(), HasSubstr(each.note));
            write("scene" + ending_, ending_ == ".glb" ? file.binary() : file.text(), motion, 0.05);
            EXPECT_LT(errorOfClip(motion), 6e-5);
            EXPECT_LE(shapes_->count, 4U);
        }
}

// "lower" gets where it has to be from where keys can bring "upper", which has shear in the scene
TEST(JointTracks, AreBelowWhatTheFileHasAbove) {
    const storage::JsonDocument file = parseGltf(Strip().write().text());
    const GltfNodes nodes(file);
    HMatrix sheared, moved;
    sheared(1, 0) = 0.5;
    for (unsigned axis = 0; axis < 3; ++axis)
        moved(3, axis) = 2.0;
    const JointTracks tracks(nodes, {0, 1}, {{sheared}, {moved}});
    const std::vector<HMatrix> worlds = tracks.worlds(0);
    EXPECT_FALSE(worlds[0].isEquivalent(sheared, 0.1));
    EXPECT_TRUE(worlds[1].isEquivalent(moved, 1e-6));
}

TEST_F(SourceClipTest, ChangesNothingElse) {
    Strip strip;
    strip.more = [](GltfWriter& file) {
        addMorph(file);
        file.more = R"(,"materials":[{"name":"paint","extras":{"ours":[1,2.5]}}],"images":[{"uri":"no.png"}])";
    };
    const GltfWriter file = strip.write();
    const auto notes = write("scene.gltf", file.text(), anyMotion());
    EXPECT_THAT(notes.front(), HasSubstr("its picture \"no.png\""));
    std::ifstream stream(path("clip.glb"), std::ios::binary);
    const std::string bytes(std::istreambuf_iterator<char>(stream), {});
    const storage::JsonDocument clip = parseGltf(gltfParts(bytes).json);
    const storage::JsonDocument before = parseGltf(file.text());
    for (const char* key : {"materials", "images", "skins", "scenes"})
        EXPECT_EQ(gltfText(clip[key]), gltfText(before[key])) << key;
    EXPECT_EQ(gltfText(clip["meshes"][0]), gltfText(before["meshes"][0])) << "another node shows it";
    EXPECT_EQ(gltfText(clip["meshes"][1]["extras"]),
              R"({"targetNames":["target 1","frame 1","frame 2","frame 3","frame 4"]})");
    EXPECT_EQ(gltfText(clip["meshes"][1]["weights"]), "[0.25,0.0,0.0,0.0,0.0]");
}

TEST_F(SourceClipTest, SaysWhyAFileCannotBeUsed) {
    write("scene.gltf", Strip().write().text(), anyMotion());
    SceneSession session;
    session.open(path("scene.json"));
    const auto refusal = [&] { return failureOf([] { findClipSource(findNode("arm"), stripVertices); }); };
    EXPECT_THAT(failureOf([] { findClipSource(findNode("arm"), 5); }), HasSubstr("does not fit arm, which has 5"));
    Strip torn;
    torn.seam = {0.5F, 0.25F}; // not joined there
    std::ofstream(path("scene.gltf")) << torn.write().text();
    EXPECT_THAT(refusal(), HasSubstr("has no mesh with the vertices of arm: it has changed"));
    fs::remove(path("scene.gltf"));
    EXPECT_THAT(refusal(), HasSubstr("scene.gltf: does not exist"));
    setText(plugOf(findNode("character"), "sourceFile"), "arm.fbx");
    EXPECT_THAT(refusal(), HasSubstr("arm.fbx is no glTF file"));
}

TEST(FitInSkin, HoldsTheErrorBehindTheSkin) {
    std::mt19937 random(8);
    std::normal_distribution<float> any;
    std::vector<ClipShape> frames(12, {std::vector<float>(30), {}});
    for (float amount = 1.0F; amount > 1e-4F; amount *= 0.3F) {
        std::vector<float> shape(30);
        std::generate(shape.begin(), shape.end(), [&] { return any(random); });
        for (ClipShape& frame : frames) {
            const float weight = amount * any(random);
            for (std::size_t i = 0; i < shape.size(); ++i)
                frame.points[i] += weight * shape[i];
        }
    }
    const HMatrix skin = HQuaternion(0.7, {1, 2, 3}).asMatrix() * 10.0;
    const FittedClip before = fitClip(frames, 0.01);
    const FittedClip behind = fitInSkin(frames, 0.1, [&](std::size_t) { return std::vector<HMatrix>(10, skin); });
    EXPECT_EQ(behind.clip.targets.size(), before.clip.targets.size());
    EXPECT_NEAR(behind.error, 10.0 * before.error, 1e-5);
}

TEST(BeforeSkin, TurnsNormalsAsTheSurface) {
    const MeshPolygons polygons{3, {3}, {0, 1, 2}};
    const std::vector<std::int32_t> sceneVertexOf{0, 1, 2, 2}; // a hard edge
    HMatrix skin = HQuaternion(0.7, {1, 2, 3}).asMatrix() * 1.5;
    skin.setRow(3, {4, 5, 6});
    const HMatrix turn = HQuaternion(1.1, {-1, 0, 2}).asMatrix();
    FileFrame file{{{0, 0, 0, 1, 0, 0, 0, 1, 0, 0, 1, 0}, {0, 0, 1, 0, 0.6F, 0.8F, 0, 0, 1, 1, 0, 0}},
                   std::vector<HMatrix>(4, skin)};
    const auto at = [](const std::vector<float>& xyz, std::size_t i) {
        return HVector(static_cast<double>(xyz[3 * i]), static_cast<double>(xyz[3 * i + 1]),
                       static_cast<double>(xyz[3 * i + 2]));
    };
    std::vector<float> result;
    for (std::size_t v = 0; v < 3; ++v) {
        const HVector point = (at(file.before.points, v) * skin + skin.row(3)) * turn;
        for (unsigned axis = 0; axis < 3; ++axis)
            result.push_back(static_cast<float>(point[axis]));
    }
    // of all rotations that turn the surface so the smallest one: the axis of `turn` lies in no plane of the triangle
    BeforeSkin before(sceneVertexOf, polygons);
    const ClipShape deltas = before.deltas(file, result);
    const HVector surface = (HVector(0, 0, 1) * skin).normal() * turn;
    for (std::size_t v = 0; v < 4; ++v) {
        const HVector normal = (at(file.before.normals, v) + at(deltas.normals, v)) * skin;
        EXPECT_NEAR(normal.length(), 1.5, 1e-6);
        EXPECT_NEAR(normal.normal() * surface, at(file.before.normals, v).z, 1e-6) << "the angle to the surface stays";
    }
    file.blended[1] = HMatrix() * 0.0;
    file.blended[2].setRow(2, {0, 0, 1e-9});
    const ClipShape flat = before.deltas(file, result);
    EXPECT_EQ(at(flat.points, 1), HVector());
    EXPECT_EQ(before.stuck().size(), 2U);
    EXPECT_GT(before.stuck().at(1).farthest, 1.0);
}

} // namespace
} // namespace quarn
