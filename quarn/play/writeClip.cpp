// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: morph targets, animations.
#include "quarn/play/ClipFile.h"
#include "quarn/scene/gltfParts.h"

#include <ostream>

namespace quarn {
namespace {

// the accessors, by number: two for the base, two for each target, and these
struct Accessors {
    explicit Accessors(std::size_t targetCount)
        : indices(2 + 2 * targetCount)
        , seconds(indices + 1)
        , weights(indices + 2)
        , uvs(indices + 3) {}
    std::size_t indices, seconds, weights, uvs;
};

// the binary chunk: views of what is alike, one after the other
struct Numbers {
    std::vector<std::string_view> parts;
    std::size_t vectorBytes = 0, indexBytes = 0, secondBytes = 0, weightBytes = 0, uvBytes = 0;
};

void addShape(Numbers& numbers, const ClipShape& shape) {
    for (const std::vector<float>* part : {&shape.points, &shape.normals}) {
        numbers.parts.push_back(bytesOf(*part));
        numbers.vectorBytes += numbers.parts.back().size();
    }
}

class ClipDocument {
public:
    ClipDocument(const MorphClip& clip, const ClipMotion& motion)
        : clip_(clip)
        , motion_(motion)
        , accessors_(clip.targets.size()) {}

    std::string text(const Numbers& numbers, const GltfVertices& vertices, const std::vector<float>& seconds) {
        hasUvs_ = !vertices.uvs.empty();
        json_.StartObject();
        writeGltfAsset(json_);
        writeCount(json_, "scene", 0);
        raw("scenes", R"([{"nodes": [0]}])");
        writeNode();
        writeMesh();
        writeAnimation();
        writeAccessors(vertices, seconds);
        writeBuffer(numbers);
        json_.EndObject();
        return {buffer_.GetString(), buffer_.GetSize()};
    }

private:
    void raw(const char* key, std::string_view value) {
        json_.Key(key);
        json_.RawValue(value.data(), value.size(), rapidjson::kArrayType);
    }

    void beginList(const char* key) {
        json_.Key(key);
        json_.StartArray();
    }

    void writeNode() {
        beginList("nodes");
        json_.StartObject();
        writeText(json_, "name", motion_.meshName);
        writeCount(json_, "mesh", 0);
        if (motion_.metersPerUnit != 1.0) {
            beginList("scale");
            for (int axis = 0; axis < 3; ++axis)
                json_.Double(motion_.metersPerUnit);
            json_.EndArray();
        }
        json_.EndObject();
        json_.EndArray();
    }

    void writeShape(std::size_t first) {
        json_.StartObject();
        writeCount(json_, "POSITION", first);
        writeCount(json_, "NORMAL", first + 1);
        if (first == 0 && hasUvs_)
            writeCount(json_, "TEXCOORD_0", accessors_.uvs);
        json_.EndObject();
    }

    void writeMesh() {
        beginList("meshes");
        json_.StartObject();
        writeText(json_, "name", motion_.meshName);
        beginList("primitives");
        json_.StartObject();
        json_.Key("attributes");
        writeShape(0);
        writeCount(json_, "indices", accessors_.indices);
        beginList("targets");
        for (std::size_t target = 0; target < clip_.targets.size(); ++target)
            writeShape(2 + 2 * target);
        json_.EndArray();
        json_.EndObject();
        json_.EndArray();
        json_.Key("extras"); // where readers look for the names of targets
        json_.StartObject();
        beginList("targetNames");
        for (const ClipTarget& target : clip_.targets)
            writeText(json_, target.name);
        json_.EndArray();
        json_.EndObject();
        json_.EndObject();
        json_.EndArray();
    }

    void writeAnimation() {
        beginList("animations");
        json_.StartObject();
        writeText(json_, "name", motion_.meshName);
        raw("channels", R"([{"sampler": 0, "target": {"node": 0, "path": "weights"}}])");
        beginList("samplers");
        json_.StartObject();
        writeCount(json_, "input", accessors_.seconds);
        writeCount(json_, "output", accessors_.weights);
        writeText(json_, "interpolation", "LINEAR");
        json_.EndObject();
        json_.EndArray();
        json_.EndObject();
        json_.EndArray();
    }

    void beginAccessor(std::size_t view, std::size_t offset, unsigned type, const char* shape, std::size_t count) {
        json_.StartObject();
        writeCount(json_, "bufferView", view);
        writeCount(json_, "byteOffset", offset);
        writeCount(json_, "componentType", type);
        writeText(json_, "type", shape);
        writeCount(json_, "count", count);
    }

    void writeVectors(const ClipShape& shape, std::size_t& offset) {
        const std::size_t count = shape.points.size() / 3;
        beginAccessor(0, offset, gltfFloat, "VEC3", count);
        writeGltfBox(json_, shape.points, 3);
        json_.EndObject();
        beginAccessor(0, offset + bytesOf(shape.points).size(), gltfFloat, "VEC3", count);
        json_.EndObject();
        offset += bytesOf(shape.points).size() + bytesOf(shape.normals).size();
    }

    void writeAccessors(const GltfVertices& vertices, const std::vector<float>& seconds) {
        beginList("accessors");
        std::size_t offset = 0;
        writeVectors(clip_.base, offset);
        for (const ClipTarget& target : clip_.targets)
            writeVectors(target.shape, offset);
        beginAccessor(1, 0, gltfUnsigned, "SCALAR", vertices.triangles.size());
        json_.EndObject();
        beginAccessor(2, 0, gltfFloat, "SCALAR", seconds.size());
        writeGltfBox(json_, seconds, 1);
        json_.EndObject();
        beginAccessor(3, 0, gltfFloat, "SCALAR", clip_.weights.size());
        json_.EndObject();
        if (hasUvs_) {
            beginAccessor(4, 0, gltfFloat, "VEC2", vertices.count());
            json_.EndObject();
        }
        json_.EndArray();
    }

    void writeView(std::size_t& offset, std::size_t length, unsigned target, std::size_t stride = 0) {
        json_.StartObject();
        writeCount(json_, "buffer", 0);
        writeCount(json_, "byteOffset", offset);
        writeCount(json_, "byteLength", length);
        if (target != 0)
            writeCount(json_, "target", target);
        if (stride != 0)
            writeCount(json_, "byteStride", stride);
        json_.EndObject();
        offset += length;
    }

    void writeBuffer(const Numbers& numbers) {
        std::size_t offset = 0;
        beginList("bufferViews");
        writeView(offset, numbers.vectorBytes, gltfVertexBuffer, 3 * sizeof(float));
        writeView(offset, numbers.indexBytes, gltfIndexBuffer);
        writeView(offset, numbers.secondBytes, 0);
        writeView(offset, numbers.weightBytes, 0);
        if (hasUvs_)
            writeView(offset, numbers.uvBytes, gltfVertexBuffer);
        json_.EndArray();
        beginList("buffers");
        json_.StartObject();
        writeCount(json_, "byteLength", offset);
        json_.EndObject();
        json_.EndArray();
    }

    const MorphClip& clip_;
    const ClipMotion& motion_;
    Accessors accessors_;
    bool hasUvs_ = false;
    rapidjson::StringBuffer buffer_;
    JsonWriter json_{buffer_};
};

} // namespace

void writeClip(std::ostream& out, const MorphClip& clip, const GltfVertices& vertices,
               const std::vector<float>& seconds, const ClipMotion& motion) {
    Numbers numbers;
    addShape(numbers, clip.base);
    for (const ClipTarget& target : clip.targets)
        addShape(numbers, target.shape);
    numbers.parts.insert(numbers.parts.end(),
                         {bytesOf(vertices.triangles), bytesOf(seconds), bytesOf(clip.weights), bytesOf(vertices.uvs)});
    numbers.indexBytes = bytesOf(vertices.triangles).size();
    numbers.secondBytes = bytesOf(seconds).size();
    numbers.weightBytes = bytesOf(clip.weights).size();
    numbers.uvBytes = bytesOf(vertices.uvs).size();
    writeGlb(out, ClipDocument(clip, motion).text(numbers, vertices, seconds), numbers.parts);
}

} // namespace quarn
