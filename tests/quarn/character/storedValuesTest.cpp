// SPDX-License-Identifier: Apache-2.0
// One character, stored in all the ways that glTF has for numbers.
#include "quarn/character/characterFiles.h"
#include "quarn/import/RandomCharacter.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>
#include <meshoptimizer.h>

#include <algorithm>
#include <cmath>
#include <limits>

namespace quarn {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

using Floats = std::vector<float>;
using Shorts = std::vector<std::uint16_t>;

// How the numbers of a file are stored: here as they are.
struct Storage {
    virtual ~Storage() = default;
    virtual std::size_t points(GltfWriter& file, const Floats& xyz) const { return file.floats("VEC3", xyz); }
    virtual std::size_t deltas(GltfWriter& file, const Floats& xyz) const { return points(file, xyz); }
    virtual std::size_t matrices(GltfWriter& file, const Floats& values) const { return file.floats("MAT4", values); }
    virtual std::size_t fours(GltfWriter& file, const Floats& values) const { return file.floats("VEC4", values); }
    virtual std::size_t numbers(GltfWriter& file, const Floats& values) const { return file.floats("SCALAR", values); }
    virtual std::size_t joints(GltfWriter& file, const Shorts& values) const { return file.shorts("VEC4", values); }
    virtual std::size_t corners(GltfWriter& file, const Shorts& values) const { return file.shorts("SCALAR", values); }
    virtual std::string interpolation() const { return "STEP"; } ///< of the numbers
    virtual void finish(GltfWriter&) const {}
};

// whole numbers for -1 ... 1, of half the size and with padding between; the bind matrices double them again
struct Quantized : Storage {
    // -1 is -32767, and so is what lies below
    static std::int16_t shortOf(float value) {
        return value == -1.0F ? std::int16_t{-32768} : static_cast<std::int16_t>(std::lround(value * 32767));
    }
    std::size_t points(GltfWriter& file, const Floats& xyz) const override {
        std::string bytes;
        for (std::size_t i = 0; i < xyz.size(); ++i) {
            const auto whole = shortOf(xyz[i] / 2);
            bytes.append(reinterpret_cast<const char*>(&whole), sizeof whole);
            bytes.append(i % 3 == 2 ? 2 : 0, 'x');
        }
        return file.accessor("\"bufferView\":" + std::to_string(file.view(bytes, ",\"byteStride\":8")) +
                             ",\"componentType\":5122,\"normalized\":true,\"type\":\"VEC3\",\"count\":" +
                             std::to_string(xyz.size() / 3));
    }
    std::size_t matrices(GltfWriter& file, const Floats& values) const override {
        Floats doubled = values;
        for (std::size_t i = 0; i < doubled.size(); ++i)
            doubled[i] *= i % 16 < 12 ? 2 : 1;
        return file.floats("MAT4", doubled);
    }
    std::size_t fours(GltfWriter& file, const Floats& values) const override {
        std::vector<std::int16_t> whole;
        for (const float value : values)
            whole.push_back(shortOf(value));
        bool signs = false;
        for (const float value : values)
            signs = signs || value < 0;
        if (signs)
            return file.values("VEC4", 5122, whole, ",\"normalized\":true");
        std::vector<std::uint8_t> bytes;
        for (const float value : values)
            bytes.push_back(static_cast<std::uint8_t>(std::lround(value * 255)));
        return file.values("VEC4", 5121, bytes, ",\"normalized\":true");
    }
    std::size_t numbers(GltfWriter& file, const Floats& values) const override {
        Shorts whole;
        for (const float value : values)
            whole.push_back(static_cast<std::uint16_t>(std::lround(value * 65535)));
        return file.values("SCALAR", 5123, whole, ",\"normalized\":true");
    }
    void finish(GltfWriter& file) const override { file.more = R"(,"extensionsRequired":["KHR_mesh_quantization"])"; }
};

// every second element, or none at all, lies in the list of changes; what is below is wrong there, or not at all
struct Sparse : Storage {
    template <class Value>
    static std::size_t write(GltfWriter& file, const char* type, int component, std::size_t width,
                             const std::vector<Value>& values, bool onZeros) {
        std::vector<Value> below = values, changes;
        std::vector<std::uint8_t> indices;
        for (std::size_t i = 0; i < values.size() / width; ++i)
            if (onZeros || i % 2 == 1) {
                indices.push_back(static_cast<std::uint8_t>(i));
                for (std::size_t k = i * width; k < (i + 1) * width; ++k) {
                    changes.push_back(values[k]);
                    below[k] = 77;
                }
            }
        const auto bytes = [](const auto& list) {
            return std::string(reinterpret_cast<const char*>(list.data()), list.size() * sizeof(list[0]));
        };
        const std::string sparse =
            ",\"sparse\":{\"count\":" + std::to_string(indices.size()) +
            ",\"indices\":{\"componentType\":5121,\"bufferView\":" + std::to_string(file.view(bytes(indices))) +
            "},\"values\":{\"byteOffset\":0," + "\"bufferView\":" + std::to_string(file.view(bytes(changes))) + "}}";
        if (!onZeros)
            return file.values(type, component, below, sparse);
        return file.accessor("\"componentType\":" + std::to_string(component) + ",\"type\":\"" + type +
                             "\",\"count\":" + std::to_string(values.size() / width) + sparse);
    }
    std::size_t points(GltfWriter& file, const Floats& v) const override {
        return write(file, "VEC3", 5126, 3, v, false);
    }
    std::size_t deltas(GltfWriter& file, const Floats& v) const override {
        return write(file, "VEC3", 5126, 3, v, true);
    }
    std::size_t fours(GltfWriter& file, const Floats& v) const override {
        return write(file, "VEC4", 5126, 4, v, false);
    }
    std::size_t joints(GltfWriter& file, const Shorts& v) const override {
        return write(file, "VEC4", 5123, 4, v, false);
    }
    std::size_t corners(GltfWriter& file, const Shorts& v) const override {
        return write(file, "SCALAR", 5123, 1, v, true);
    }
};

// all in a buffer that there is not; floats are exact, and fours go through the filter for them
struct Meshopt : Storage {
    static std::size_t write(GltfWriter& file, const std::string& type, int component, std::size_t count,
                             std::size_t stride, const std::string& mode, const std::string& coded) {
        const std::string shape =
            "\"byteStride\":" + std::to_string(stride) + ",\"count\":" + std::to_string(count) + ",\"mode\":" + mode;
        const std::size_t view =
            file.viewLike(R"({"buffer":1,"byteLength":)" + std::to_string(count * stride) +
                              (mode == "\"TRIANGLES\"" ? "" : ",\"byteStride\":" + std::to_string(stride)) +
                              R"(,"extensions":{"EXT_meshopt_compression":{BYTES,)" + shape + "}}}",
                          coded);
        return file.accessor("\"bufferView\":" + std::to_string(view) +
                             ",\"componentType\":" + std::to_string(component) + ",\"count\":" + std::to_string(count) +
                             ",\"type\":\"" + type + "\"");
    }
    static std::size_t vertices(GltfWriter& file, const std::string& type, int component, std::size_t stride,
                                const void* data, std::size_t size, const std::string& filter = "\"NONE\"") {
        const std::size_t count = size / stride;
        std::string coded(meshopt_encodeVertexBufferBound(count, stride), '\0');
        coded.resize(meshopt_encodeVertexBuffer(reinterpret_cast<unsigned char*>(coded.data()), coded.size(), data,
                                                count, stride));
        return write(file, type, component, count, stride, "\"ATTRIBUTES\",\"filter\":" + filter, coded);
    }
    std::size_t points(GltfWriter& file, const Floats& v) const override {
        return vertices(file, "VEC3", 5126, 12, v.data(), v.size() * 4);
    }
    std::size_t fours(GltfWriter& file, const Floats& v) const override {
        Floats coded(v.size());
        meshopt_encodeFilterExp(coded.data(), v.size() / 4, 16, 23, v.data());
        return vertices(file, "VEC4", 5126, 16, coded.data(), v.size() * 4, "\"EXPONENTIAL\"");
    }
    std::size_t joints(GltfWriter& file, const Shorts& v) const override {
        return vertices(file, "VEC4", 5123, 8, v.data(), v.size() * 2);
    }
    std::size_t corners(GltfWriter& file, const Shorts& v) const override {
        const std::vector<unsigned> wide(v.begin(), v.end());
        std::string coded(meshopt_encodeIndexBufferBound(wide.size(), 8), '\0');
        coded.resize(meshopt_encodeIndexBuffer(reinterpret_cast<unsigned char*>(coded.data()), coded.size(),
                                               wide.data(), wide.size()));
        return write(file, "SCALAR", 5123, wide.size(), 2, "\"TRIANGLES\"", coded);
    }
    void finish(GltfWriter& file) const override {
        file.more = R"(,"extensionsRequired":["EXT_meshopt_compression"])";
        file.buffers = R"(,{"byteLength":100000,"extensions":{"EXT_meshopt_compression":{"fallback":true}}})";
    }
};

// the two weights of a key between their tangents
struct Cubic : Storage {
    std::size_t numbers(GltfWriter& file, const Floats& v) const override {
        return file.floats("SCALAR", {9, 9, v[0], v[1], 9, 9, 9, 9, v[2], v[3], 9, 9});
    }
    std::string interpolation() const override { return "CUBICSPLINE"; }
};

// the strip, turning in its middle, with two morph targets and their weights
GltfWriter movingStrip(const Storage& storage) {
    const auto text = [](std::size_t index) { return std::to_string(index); };
    Strip strip;
    strip.mesh = R"({"name":"arm","mesh":0,"skin":0,"weights":[0.5,0]})";
    GltfWriter file = strip.write();
    file.replace("POSITION", storage.points(file, stripPoints()));
    file.replace("indices", storage.corners(file, stripTriangles()));
    Shorts joints;
    Floats weights;
    for (const float lower : {0.0F, 0.6F, 0.6F, 0.0F, 0.6F, 1.0F, 1.0F, 0.6F}) {
        joints.insert(joints.end(), {0, 1, 0, 0});
        weights.insert(weights.end(), {1.0F - lower, lower, 0.0F, 0.0F});
    }
    file.replace("JOINTS_0", storage.joints(file, joints));
    file.replace("WEIGHTS_0", storage.fours(file, weights));
    file.skins[0] = R"({"joints":[0,1],"inverseBindMatrices":)" +
                    text(storage.matrices(file, {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0,  0, 0, 1, //
                                                 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, -1, 0, 0, 1})) +
                    "}";
    Floats up(24, 0.0F), apart(24, 0.0F);
    up[20] = -2.0F;
    up[5] = up[14] = 0.75F; // the two halves of a seam's end
    apart[8] = 0.5F;        // one half of the other end
    const std::size_t first = storage.deltas(file, up);
    const std::size_t second = storage.deltas(file, apart);
    std::string& mesh = file.meshes[0];
    mesh.insert(mesh.find("\"indices\""),
                R"("targets":[{"POSITION":)" + text(first) + R"(},{"POSITION":)" + text(second) + "}],");
    mesh.insert(1, R"("extras":{"targetNames":["up","up"]},)");
    const std::size_t times = file.floats("SCALAR", {0, 1});
    const std::size_t turns = storage.fours(file, {0, 0, 0.6F, 0.8F, 0, 0, -1, 0});
    const std::size_t shapes = storage.numbers(file, {0, 1, 0.25F, 0.5F});
    file.animations = {R"({"name":"wave","samplers":[{"input":)" + text(times) + ",\"output\":" + text(turns) +
                       "},{\"input\":" + text(times) + ",\"output\":" + text(shapes) + R"(,"interpolation":")" +
                       storage.interpolation() +
                       R"("}],"channels":[{"sampler":1,"target":{"node":2,"path":"weights"}},)"
                       R"({"sampler":0,"target":{"node":1,"path":"rotation"}}]})"};
    storage.finish(file);
    return file;
}

void expectSame(const Character& character, const Character& plain, double step) {
    ASSERT_EQ(character.meshes.size(), 1U);
    const CharacterMesh& mesh = character.meshes[0];
    const CharacterMesh& wanted = plain.meshes.at(0);
    EXPECT_EQ(mesh.joinedOf, wanted.joinedOf);
    EXPECT_EQ(mesh.corners, wanted.corners);
    for (const double seconds : {-1.0, 0.0, 1.0}) {
        const auto worlds = plainWorlds(character, seconds);
        const auto plainOnes = plainWorlds(plain, seconds);
        for (std::size_t v = 0; v < wanted.points.size(); ++v)
            EXPECT_TRUE(plainPoint(mesh, worlds, v).isEquivalent(plainPoint(wanted, plainOnes, v), step)) << v;
    }
    ASSERT_EQ(mesh.morphTargets.size(), 2U);
    for (std::size_t t = 0; t < 2; ++t) {
        ASSERT_EQ(mesh.morphTargets[t].vertices, wanted.morphTargets.at(t).vertices);
        for (std::size_t i = 0; i < mesh.morphTargets[t].deltas.size(); ++i)
            EXPECT_TRUE((mesh.morphTargets[t].deltas[i] * mesh.bindings[0].inverseBind)
                            .isEquivalent(wanted.morphTargets[t].deltas[i], std::min(step, 4e-5)));
    }
    ASSERT_EQ(character.animations.size(), 1U);
    ASSERT_EQ(character.animations[0].morphs.size(), 2U);
    for (std::size_t t = 0; t < 2; ++t)
        for (std::size_t key = 0; key < 2; ++key)
            EXPECT_NEAR(character.animations[0].morphs[t].weight.keys.at(key).value,
                        plain.animations.at(0).morphs.at(t).weight.keys.at(key).value, step);
}

TEST(StoredValues, GiveTheSameCharacterHoweverTheyAreStored) {
    const Character plain = read(movingStrip(Storage()));
    const struct {
        const char* name;
        const Storage& storage;
        double step;
        std::size_t warnings = 0;
    } ways[] = {{"quantized", Quantized(), 3.0 / 255},
                {"sparse", Sparse(), 1e-7},
                {"meshopt", Meshopt(), 2e-6},
                {"cubic", Cubic(), 1e-9, 1}};
    for (const auto& way : ways) {
        SCOPED_TRACE(way.name);
        const GltfWriter file = movingStrip(way.storage);
        expectSame(read(file), plain, way.step);
        expectSame(readBytesAs("binary.glb", file.binary()), plain, way.step);
        EXPECT_EQ(read(file).warnings.size(), way.warnings);
    }
}

TEST(StoredValues, MorphTargetsAreReadWithTheirWeights) {
    const Character character = read(movingStrip(Storage()));
    const CharacterMesh& mesh = character.meshes.at(0);
    // what one target moves apart stays apart
    EXPECT_THAT(mesh.joinedOf, ElementsAre(0, 1, 2, 3, 1, 4, 5, 6));
    ASSERT_EQ(mesh.morphTargets.size(), 2U);
    EXPECT_EQ(mesh.morphTargets[0].name, "up");
    EXPECT_EQ(mesh.morphTargets[1].name, "up1");
    EXPECT_THAT(mesh.morphTargets[0].vertices, ElementsAre(1, 5));
    EXPECT_THAT(mesh.morphTargets[0].deltas, ElementsAre(HVector(0, 0, 0.75), HVector(0, 0, -2)));
    EXPECT_THAT(mesh.morphTargets[1].vertices, ElementsAre(2));
    EXPECT_EQ(mesh.morphTargets[0].restWeight, 0.5);
    const std::vector<MorphChannel>& morphs = character.animations.at(0).morphs;
    ASSERT_EQ(morphs.size(), 2U);
    EXPECT_EQ(morphs[1].target, 1U);
    EXPECT_EQ(morphs[1].weight.interpolation, Interpolation::Step);
    EXPECT_EQ(morphs[1].weight.keys.at(0).value, 1.0);
    EXPECT_EQ(morphs[1].weight.keys.at(1).value, 0.5);
    EXPECT_EQ(character.animations[0].channels.size(), 1U);
}

// points (by 14 bits), joints and weights of the strip as Draco's encoder writes them, with the ids 0, 1 and 2
const std::string dracoStrip =
    "RFJBQ08CAgEAAAAECAEAAQIAAgMEBQYEBgcBAwAJAwAABAQEAAEECQQAAgIBAAABAQAPAwEILwE4AwBQhfj/AQAAAAD4/wGA"
    "/x8AAAD+//8fAPD/AQAAAAD4/wGA/h8AAAAAAAAAAP8/AAAAAQEBAQIBPgECAwC/kwAAAAABAAAAAACAPwAAAAAAAAAAAAAA"
    "AAAAAD8AAAA/AAAAAAAAAAAAAAA/AAAAPwAAAAAAAAAAAACAPwAAAAAAAAAAAAAAAAAAAD8AAAA/AAAAAAAAAAAAAAAAAACA"
    "PwAAAAAAAAAAAAAAAAAAgD8AAAAAAAAAAAAAAD8AAAA/AAAAAAAAAAAAAAAAAAAAAAAAAAAAAABADg==";

TEST(StoredValues, DracoIsLeftToTheImporter) {
    const auto dracoFile = [](int weightType) {
        GltfWriter file = Strip().write();
        file.buffers = R"(,{"byteLength":274,"uri":"data:application/octet-stream;base64,)" + dracoStrip + "\"}";
        file.more = R"(,"extensionsUsed":["KHR_draco_mesh_compression"])"
                    R"(,"extensionsRequired":["KHR_draco_mesh_compression"])";
        const std::size_t view = file.viewLike(R"({"buffer":1,"byteLength":274,"extras":{BYTES}})", "");
        const auto values = [&](const char* type, int component, int count) {
            return file.accessor("\"type\":\"" + std::string(type) + "\",\"componentType\":" +
                                 std::to_string(component) + ",\"count\":" + std::to_string(count));
        };
        file.replace("POSITION", values("VEC3", 5126, 8));
        file.replace("JOINTS_0", values("VEC4", 5123, 8));
        file.replace("WEIGHTS_0", values("VEC4", weightType, 8));
        file.replace("indices", values("SCALAR", 5123, 12));
        std::string& mesh = file.meshes[0];
        mesh.insert(mesh.find("\"attributes\""), R"("extensions":{"KHR_draco_mesh_compression":{"bufferView":)" +
                                                     std::to_string(view) +
                                                     R"(,"attributes":{"POSITION":0,"JOINTS_0":1,"WEIGHTS_0":2}}},)");
        return file;
    };
    const Character plain = read(Strip().write());
    const Character character = read(dracoFile(5126));
    ASSERT_EQ(character.meshes.at(0).joinedOf.size(), 8U);
    EXPECT_EQ(character.meshes[0].polygonSizes, plain.meshes.at(0).polygonSizes);
    const std::vector<HMatrix> worlds = plainWorlds(plain, -1.0);
    for (std::size_t v = 0; v < 6; ++v)
        EXPECT_TRUE(plainPoint(character.meshes[0], worlds, v).isEquivalent(plain.meshes[0].points[v], 2.0 / 16383));
    EXPECT_EQ(character.meshes[0].influences.at(1).at(1).weight, 0.5);
    EXPECT_THAT(failureOf([&] { read(dracoFile(5121)); }), HasSubstr("does not hold floats by fours"));
}

// one replacement in the text of a sound file
TEST(StoredValues, DamagedOnesAreRefusedWithTheReason) {
    const Meshopt meshopt;
    const Sparse sparse;
    const Storage plain;
    const struct {
        const Storage& storage;
        const char *what, *by, *reason;
    } damages[] = {
        {meshopt, "\"mode\":\"ATTRIBUTES\"", "\"mode\":\"TRIANGLES\"", "has a stride of 12 bytes"},
        {meshopt, "\"mode\":\"ATTRIBUTES\"", "\"mode\":\"x\"", "the mode \"x\", which is not known"},
        {meshopt, "\"filter\":\"NONE\"", "\"filter\":\"QUATERNION\"", "has a stride of 12 bytes"},
        {meshopt, "\"byteStride\":12,\"count\":8", "\"byteStride\":12,\"count\":7", "and its compressed data 84"},
        {meshopt, "\"byteStride\":12,\"count\":8", "\"byteStride\":12,\"count\":80", "meshopt compression is damaged"},
        {meshopt, "\"byteStride\":12,\"count\":8", "\"byteStride\":12,\"count\":4000000000",
         "more than 1073741824 bytes"},
        {meshopt, "\"EXT_meshopt_compression\":{\"buffer\":0", "\"EXT_meshopt_compression\":{\"buffer\":2",
         "refers to buffers[2]"},
        {meshopt, "\"EXT_meshopt_compression\":{\"buffer\":0", "\"EXT_meshopt_compression\":{\"buffer\":1",
         "buffers[1] has no data"},
        {sparse, "\"sparse\":{\"count\":4", "\"sparse\":{\"count\":9", "changes more elements than it has"},
        {sparse, "\"sparse\":{\"count\":4", "\"sparse\":{\"count\":5", "5 elements leave bufferViews"},
        {sparse, "\"indices\":{\"componentType\":5121", "\"indices\":{\"componentType\":5126", "no unsigned whole"},
        {sparse, "\"indices\":{", "\"index\":{", "no unsigned whole"},
        {sparse, "\"values\":{", "\"value\":{", "without \"values\" in a view"},
        {plain, "\"weights\":[0.5,0]", "\"weights\":[0.5]", "nodes[2] has other weights than its 2 morph targets"},
        {plain, "\"weights\":[0.5,0]", "\"weights\":[0.5,[]]", "a weight that is no number"},
        {plain, "\"targets\":[{\"POSITION\":10", "\"targets\":[{\"POSITION\":1", "targets[0] uses accessors[1]"},
        {plain, "\"targets\":[{", "\"targets\":[{},{", "a sampler of 2 times and 4 values"},
        {plain, "\"count\":4,\"type\":\"SCALAR\"", "\"count\":3,\"type\":\"SCALAR\"", "2 times and 3 values"},
        {plain, "base64,", "base64,!", ""},
    };
    for (const auto& damage : damages) {
        SCOPED_TRACE(damage.by);
        std::string text = movingStrip(damage.storage).text();
        const std::size_t at = text.find(damage.what);
        ASSERT_NE(at, std::string::npos) << text.substr(0, 4000);
        text.replace(at, std::string(damage.what).size(), damage.by);
        EXPECT_THAT(failureOf([&] { readBytesAs("damaged.gltf", text); }), HasSubstr(damage.reason));
    }
}

// an index that only the data show to be wrong, and numbers that are none
TEST(StoredValues, DamagedDataAreRefusedWithTheReason) {
    struct Beyond : Storage {
        std::size_t points(GltfWriter& file, const Floats& xyz) const override {
            const std::string places = ",\"sparse\":{\"count\":1,\"indices\":{\"componentType\":5121,\"bufferView\":" +
                                       std::to_string(file.view("\x08")) + "},\"values\":{\"bufferView\":" +
                                       std::to_string(file.view(std::string(12, '\0'))) + "}}";
            return file.values("VEC3", 5126, xyz, places);
        }
    };
    struct Endless : Storage {
        std::size_t deltas(GltfWriter& file, const Floats& xyz) const override {
            Floats broken = xyz;
            broken[3] = std::numeric_limits<float>::infinity();
            return file.floats("VEC3", broken);
        }
    };
    struct Large : Storage {
        std::size_t fours(GltfWriter& file, const Floats& values) const override {
            return file.values("VEC4", 5121, std::vector<std::uint8_t>(values.size(), 1));
        }
    };
    EXPECT_THAT(failureOf([] { read(movingStrip(Beyond())); }), HasSubstr("changes element 8, but has 8"));
    EXPECT_THAT(failureOf([] { read(movingStrip(Endless())); }),
                HasSubstr("the mesh \"arm\" has a morph target \"up\" with a delta that is not finite at vertex 1"));
    EXPECT_THAT(failureOf([] { read(movingStrip(Large())); }), HasSubstr("whole numbers that are not normalized"));
}

} // namespace
} // namespace quarn
