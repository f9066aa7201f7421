// SPDX-License-Identifier: Apache-2.0
// The tables of docs/formats.md: whatever goes in comes out in whatever comes out, with what the page says survives.
#include "PoseTest.h"

#include "quarn/import/importCharacter.h"
#include "quarn/play/FrameFiles.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/skins.h"
#include "quarn/scene/units.h"
#include "storage/PointCache.h"
#include "storage/framePattern.h"

#include <assimp/Exporter.hpp>
#include <assimp/Importer.hpp>
#include <assimp/scene.h>

#include <cstdlib>
#include <map>
#include <numeric>
#include <random>
#include <sstream>

namespace {

using ::testing::HasSubstr;

/// A line of a table: an ending, and what stands below each heading.
struct Row {
    std::string ending;
    std::map<std::string, std::string> cells;
    bool has(const std::string& heading) const { return cells.at(heading) != "-"; }
    bool says(const std::string& heading, const std::string& text) const {
        return cells.at(heading).find(text) != std::string::npos;
    }
};

std::vector<std::string> cellsOf(const std::string& line) {
    std::vector<std::string> cells;
    std::istringstream stream(line.substr(1));
    for (std::string cell; std::getline(stream, cell, '|');)
        cells.push_back(cell.size() > 2 ? cell.substr(1, cell.size() - 2) : "");
    return cells;
}

/// The table below a heading of the page; a row for each of the endings in its first column.
std::vector<Row> tableOf(const std::string& title) {
    std::ifstream page(NW_FORMATS_PAGE);
    std::vector<Row> rows;
    std::vector<std::string> headings;
    bool isBelow = false;
    for (std::string line; std::getline(page, line);) {
        if (line.starts_with("## "))
            isBelow = line == "## " + title;
        if (!isBelow || !line.starts_with("| "))
            continue;
        const std::vector<std::string> cells = cellsOf(line);
        if (headings.empty()) {
            headings = cells;
            continue;
        }
        std::istringstream names(cells[0]);
        for (std::string name; std::getline(names, name, '`') && std::getline(names, name, '`');) {
            Row row{name, {}};
            for (std::size_t i = 1; i < cells.size(); ++i)
                row.cells[headings[i]] = cells[i];
            rows.push_back(row);
        }
    }
    EXPECT_FALSE(rows.empty()) << title;
    return rows;
}

using Worlds = std::map<std::string, std::vector<HMatrix>>; ///< by joint, in every frame
using Motion = std::vector<std::vector<float>>;
const quarn::FrameRange frames{1, 5, 2};

class FormatsPage : public PoseTest {
protected:
    FormatsPage() { stripScene::write(scene()); }

    /// "NAME.####.obj" is a pattern, and ".npy" an ending.
    std::string file(const std::string& stem, const std::string& ending) const {
        return path(stem + (ending.starts_with("NAME") ? ending.substr(4) : ending));
    }

    /// In every frame of the twelve, and the metres of a unit.
    std::pair<Worlds, double> worldsIn(const std::string& name) const {
        const auto session = open(name);
        Worlds worlds;
        for (int frame = 1; frame <= 12; ++frame) {
            session->host().setTime(frame);
            for (const quarn::SceneJoint& joint : quarn::sceneJoints())
                worlds[joint.name].push_back(quarn::plugOf(joint.node, "worldMatrix").asMatrix());
        }
        return {std::move(worlds), quarn::metersPerUnit()};
    }

    void expectCache(const std::string& cachePath, const Row& row, const Motion& motion) const {
        const auto cache = storage::openPointCache(cachePath);
        ASSERT_EQ(cache->frameCount(), motion.size());
        for (std::size_t frame = 0; frame < motion.size(); ++frame) {
            std::vector<double> xyz(3 * cache->vertexCount());
            cache->read(frame, 0, xyz);
            EXPECT_EQ(xyz, std::vector<double>(motion[frame].begin(), motion[frame].end())) << frame;
        }
        const std::string kept = "of frames besides their number";
        EXPECT_EQ(cache->firstFrame(), row.says(kept, "first") ? std::optional(1.0) : std::nullopt);
        EXPECT_EQ(cache->frameStep(), row.says(kept, "step") ? std::optional(2.0) : std::nullopt);
        EXPECT_EQ(cache->secondsOf(1), row.says(kept, "seconds") ? std::optional(0.125) : std::nullopt);
    }

    /// The motion of a mesh whose polygons make so many triangles.
    void expectMesh(const std::string& meshPath, const Row& row, const Motion& motion, std::size_t polygons,
                    std::size_t triangles) const {
        const bool isOneFile = !storage::isFramePattern(meshPath);
        for (std::size_t frame = 0; frame < (isOneFile ? 1 : motion.size()); ++frame) {
            const auto [xyz, faces, hasUvs] = meshIn(storage::frameFile(meshPath, frames.frame(frame)).string());
            const std::size_t copies = row.says("UVs", "split") ? stripScene::seamCopies : 0;
            ASSERT_EQ(xyz.size(), motion[frame].size() + 3 * copies);
            EXPECT_EQ(hasUvs, row.has("UVs"));
            for (std::size_t i = 0; i < motion[frame].size(); ++i)
                ASSERT_NEAR(xyz[i], motion[frame][i], row.says("positions", "to the bit") ? 0.0F : 1e-6F);
            EXPECT_EQ(faces, row.says("polygons", "all") ? polygons : triangles);
        }
    }

private:
    struct Mesh {
        std::vector<float> xyz;
        std::size_t faces = 0;
        bool hasUvs = false;
    };
    // of a motion its first frame: clipTest and tests/clients/usd have the others
    static Mesh meshIn(const std::string& name) {
        const std::string text = bytes(name);
        Mesh mesh;
        mesh.hasUvs = text.find("\nvt ") != std::string::npos || text.find("primvars:st = [(") != std::string::npos;
        if (name.ends_with(".obj")) {
            const auto cache = storage::openPointCache(name);
            std::vector<double> xyz(3 * cache->vertexCount());
            cache->read(0, 0, xyz);
            mesh.xyz.assign(xyz.begin(), xyz.end());
            for (std::size_t at = 0; (at = text.find("\nf ", at)) != std::string::npos; ++at)
                ++mesh.faces;
        } else if (name.ends_with(".usda")) {
            const std::size_t counts = text.find("faceVertexCounts = ["), points = text.find(" 1: [(");
            mesh.faces = numbersIn(text.substr(counts + 20, text.find(']', counts) - counts - 20)).size();
            mesh.xyz = numbersIn(text.substr(points + 5, text.find(']', points) - points - 5));
        } else {
            Assimp::Importer importer;
            const aiScene* scene = importer.ReadFile(name, 0);
            if (scene == nullptr)
                throw std::runtime_error(importer.GetErrorString());
            const aiMesh& read = *scene->mMeshes[0];
            mesh.faces = read.mNumFaces;
            mesh.hasUvs = read.HasTextureCoords(0);
            for (unsigned i = 0; i < 3 * read.mNumVertices; ++i)
                mesh.xyz.push_back(read.mVertices[i / 3][i % 3]);
        }
        return mesh;
    }
    static std::vector<float> numbersIn(std::string text) {
        for (char& letter : text)
            letter = letter == '(' || letter == ')' || letter == ',' ? ' ' : letter;
        std::istringstream words(text);
        std::vector<float> numbers;
        for (std::string word; words >> word;)
            numbers.push_back(std::strtof(word.c_str(), nullptr));
        return numbers;
    }
};

TEST_F(FormatsPage, CachesComeOutAsAnyCacheAndMesh) {
    std::mt19937 random(3);
    std::normal_distribution<float> any;
    Motion motion; // of what is played, of which each second frame is written
    Motion whole(5, std::vector<float>(3 * stripScene::vertexCount));
    for (std::vector<float>& frame : whole)
        std::generate(frame.begin(), frame.end(), [&] { return any(random); });
    for (std::size_t i = 0; i < whole.size(); i += 2)
        motion.push_back(whole[i]);
    const quarn::MeshPolygons polygons = [&] {
        const auto session = open("scene.json");
        return quarn::polygonsOf(quarn::findPlug("strip.outMesh"));
    }();
    const std::size_t triangles = polygons.corners.size() - 2 * polygons.sizes.size();
    ASSERT_NE(triangles, polygons.sizes.size());
    for (const Row& in : tableOf("Point caches")) {
        SCOPED_TRACE(in.ending);
        quarn::FrameFiles written(file("in", in.ending), polygons, {{}, {}, {1, 5, 1}});
        for (std::size_t i = 0; i < whole.size(); ++i)
            written.add(static_cast<int>(i) + 1, whole[i]);
        written.finish();
        stripScene::quarn({"target", scene(), "--cache", file("in", in.ending), "--anyway", "-o", path("posed.json")});
        const auto play = [&](const std::string& command, const std::string& output) {
            std::vector<std::string> words{
                command, path("posed.json"), "strip_target.outMesh", "--frames", "1-5x2", "-o", output};
            if (command == "play")
                words.insert(words.begin() + 2, "--plug");
            stripScene::quarn(words);
        };
        for (const Row& out : tableOf("Point caches"))
            for (const char* command : {"bake", "play"}) {
                SCOPED_TRACE(out.ending + " by " + command);
                const std::string output = file(std::string("out ") + command, out.ending);
                play(command, output);
                expectCache(output, out, motion);
            }
        for (const Row& out : tableOf("Meshes and motions")) {
            SCOPED_TRACE(out.ending);
            play("play", file("mesh", out.ending));
            expectMesh(file("mesh", out.ending), out, motion, polygons.sizes.size(), triangles);
        }
    }
    for (const Row& row : tableOf("Meshes and motions"))
        if (!row.says("in", "cache")) {
            const std::string refusal = failureOf([&] {
                stripScene::quarn({"target", scene(), "--cache", file("mesh", row.ending)});
            });
            EXPECT_THAT(refusal, HasSubstr("the name of a point cache ends in"));
        }
}

TEST_F(FormatsPage, PosesOfAnyCharacterComeBack) {
    const char* const formats[][2] = {{".gltf", "gltf2"}, {".glb", "glb2"}, {".fbx", "fbxa"}, {".dae", "collada"}};
    pose({"--samples", "12", "--write", path("strip.glb")});
    pose({"--samples", "12", "--write", path("strip.json")});
    Assimp::Importer importer;
    ASSERT_NE(importer.ReadFile(path("strip.glb"), 0), nullptr);
    const std::unique_ptr<aiScene> strip(importer.GetOrphanedScene());
    const auto import = [&](const std::string& from, const std::string& to) {
        quarn::ImportOptions options;
        options.file = path(from);
        options.output = path(to);
        options.framesPerSecond = 24.0;
        quarn::importCharacter(options);
    };
    for (const Row& character : tableOf("Characters")) {
        SCOPED_TRACE(character.ending);
        const auto* format = std::find_if(std::begin(formats), std::end(formats),
                                          [&](const auto& row) { return row[0] == character.ending; });
        ASSERT_NE(format, std::end(formats));
        // the library that writes them loses animations: they get theirs from quarn
        const unsigned animations = std::exchange(strip->mNumAnimations, 0U);
        ASSERT_EQ(Assimp::Exporter().Export(strip.get(), (*format)[1], path("in" + character.ending)), AI_SUCCESS);
        strip->mNumAnimations = animations;
        import("in" + character.ending, "rest.json");
        stripScene::quarn({"pose", path("rest.json"), "--keys", path("strip.json"), "-o", path("in.json")});
        const auto [wanted, metersPerUnit] = worldsIn("in.json");
        EXPECT_FALSE(wanted.at("tip")[0].isEquivalent(wanted.at("tip")[5], 0.01)) << "it does not move";
        for (const Row& out : tableOf("Poses")) {
            SCOPED_TRACE(out.ending);
            const std::string output = "poses" + out.ending;
            stripScene::quarn({"pose", path("in.json"), "--write", path(output), "--frames", "1-12"});
            if (!out.has("in"))
                continue;
            const bool isImported = out.says("in", "import");
            if (isImported)
                import(output, "back.json");
            else
                stripScene::quarn({"pose", path("rest.json"), "--keys", path(output), "-o", path("back.json")});
            const Worlds read = worldsIn("back.json").first;
            const double error = std::stod(out.cells.at("joints' matrices, read back").substr(3));
            HMatrix scale; // a skeleton of glTF is in metres
            for (unsigned axis = 0; axis < 3; ++axis)
                scale(axis, axis) = isImported ? metersPerUnit : 1.0;
            for (const auto& [joint, worlds] : wanted) {
                ASSERT_EQ(read.count(joint), 1U) << joint;
                for (std::size_t frame = 0; frame < worlds.size(); ++frame)
                    EXPECT_TRUE(read.at(joint)[frame].isEquivalent(worlds[frame] * scale, error)) << joint << frame;
            }
        }
    }
}

} // namespace
