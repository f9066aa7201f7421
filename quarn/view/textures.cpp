// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: 3.8 "Texture Data", 3.9 "Materials".
#include "quarn/view/textures.h"

#include "openquarn/HFileObject.h"
#include "quarn/character/filesBeside.h"
#include "quarn/character/gltfContainer.h"
#include "quarn/character/gltfTypes.h"
#include "quarn/character/readApart.h"
#include "quarn/console/interrupt.h"
#include "quarn/process/answerBytes.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/vertexMap.h"
#include "quarn/view/materialParts.h"

#include <algorithm>
#include <filesystem>
#include <map>
#include <new>
#include <stdexcept>
#include <type_traits>
#include <utility>

namespace quarn {

// for both ways, to and from bytes
template <class Archive, class Value>
requires std::is_same_v<std::remove_const_t<Value>, PageTexture>
void transfer(Archive& archive, Value& texture) {
    archive(texture.mime);
    archive(texture.bytes);
    archive(texture.width);
    archive(texture.height);
}

namespace {

// the character's file as the scene names it, from the folder of the scene; empty without one
std::string sourcePath() {
    const std::vector<HObject> characters = nodesOfType("character");
    std::string name = characters.empty() ? "" : textOf(plugOf(characters.front(), "sourceFile"));
    if (name.empty())
        return name;
    HFileObject file;
    file.setResolveMethod(HFileObject::kSceneFolder | HFileObject::kKeepMissing);
    file.setRawFullName(name.c_str());
    return file.resolvedFullName().asStdString();
}

std::string fileName(const std::string& path) {
    return std::filesystem::path(path).filename().string();
}

/// What is looked up in the file, which may hold anything: for the process apart.
class TextureReader {
public:
    TextureReader(const std::string& path, std::string_view bytes, const WantedMesh& wanted, std::uint32_t textureSize)
        : path_(path)
        , wanted_(wanted)
        , textureSize_(textureSize)
        , parts_(gltfParts(bytes))
        , document_(parseGltf(parts_.json))
        , data_(document_, parts_.binary, [this](const std::string& uri) { return readUri(uri, "buffer"); }) {}

    PageTextures read() {
        if (listOf(document_, "textures").Empty())
            return {};
        std::size_t polygon = 0;
        for (const MaterialPart& part : materialParts(document_, data_, wanted_)) {
            PageMaterial material = part.material ? materialOf(*part.material) : PageMaterial();
            material.firstTriangle = triangle_;
            for (const std::size_t end = polygon + part.polygons; polygon < end; ++polygon)
                triangle_ += wanted_.polygons.sizes[polygon] - 2;
            material.triangles = triangle_ - material.firstTriangle;
            if (material.triangles > 0)
                made_.materials.push_back(material);
        }
        if (made_.textures.empty())
            made_.materials.clear();
        return std::move(made_);
    }

private:
    std::string readUri(const std::string& uri, const std::string& what) {
        if (leavesFolder(uri))
            throw std::runtime_error("its " + what + " \"" + uri + "\" is outside of its folder");
        return readBeside(path_, uri, what);
    }

    PageMaterial materialOf(std::size_t index) {
        const JsonValue& from = listOf(document_, "materials")[static_cast<rapidjson::SizeType>(index)];
        PageMaterial material;
        const std::string alpha = textOf(from, "alphaMode");
        material.isCutOut = alpha == "MASK" || alpha == "BLEND";
        const JsonValue* surface = member(from, "pbrMetallicRoughness");
        if (surface == nullptr)
            return material;
        const JsonValue& factor = listOf(*surface, "baseColorFactor");
        for (rapidjson::SizeType i = 0; i < material.colour.size() && i < factor.Size(); ++i)
            if (factor[i].IsNumber() && factor[i].GetDouble() >= 0.0 && factor[i].GetDouble() <= 1.0)
                material.colour[i] = static_cast<float>(factor[i].GetDouble());
        if (const JsonValue* texture = member(*surface, "baseColorTexture"))
            material.texture = textureOf(*texture, index, material.isCutOut);
        return material;
    }

    // -1, and a note, for one that is not carried over
    std::int32_t textureOf(const JsonValue& info, std::size_t material, bool keepsAlpha) {
        try {
            if (sizeOf(info, "texCoord", 0, "it") != 0)
                throw std::runtime_error("it has other texture coordinates than the first");
            if (extensionOf(info, "KHR_texture_transform") != nullptr)
                throw std::runtime_error("it has moved texture coordinates");
            return pictureOf(imageOf(info), keepsAlpha);
        } catch (const std::runtime_error& error) {
            made_.notes.push_back("the texture of " + element("materials", material) + " of " + fileName(path_) +
                                  " is not carried over: " + error.what());
            return -1;
        }
    }

    std::size_t imageOf(const JsonValue& info) const {
        const JsonValue& textures = listOf(document_, "textures");
        const auto texture = indexOf(member(info, "index"), textures.Size(), "textures", "it");
        if (!texture)
            throw std::runtime_error("it names no texture");
        const auto image = indexOf(member(textures[static_cast<rapidjson::SizeType>(*texture)], "source"),
                                   listOf(document_, "images").Size(), "images", "it");
        if (!image)
            throw std::runtime_error("it has no picture of a kind that pages hold, PNG and JPEG");
        return *image;
    }

    std::int32_t pictureOf(std::size_t image, bool keepsAlpha) {
        const auto [place, isNew] = pictures_.try_emplace({image, keepsAlpha}, -1);
        if (!isNew && place->second < 0)
            throw std::runtime_error("its picture is not to be had, as said");
        if (!isNew)
            return place->second;
        const std::string bytes = bytesOfImage(listOf(document_, "images")[static_cast<rapidjson::SizeType>(image)]);
        try {
            made_.textures.push_back(pagePicture(bytes, textureSize_, keepsAlpha));
        } catch (const std::runtime_error& error) {
            throw std::runtime_error(element("images", image) + " " + error.what());
        }
        return place->second = static_cast<std::int32_t>(made_.textures.size() - 1);
    }

    std::string bytesOfImage(const JsonValue& image) {
        if (const auto view = indexOf(member(image, "bufferView"), listOf(document_, "bufferViews").Size(),
                                      "bufferViews", "its picture"))
            return std::string(data_.view(*view));
        const std::string uri = textOf(image, "uri");
        return uri.starts_with("data:") ? dataOfUri(uri, "its picture") : readUri(uri, "picture");
    }

    const std::string& path_;
    const WantedMesh& wanted_;
    std::uint32_t textureSize_;
    GltfParts parts_;
    storage::JsonDocument document_;
    GltfBytes data_;
    PageTextures made_;
    std::uint32_t triangle_ = 0;
    std::map<std::pair<std::size_t, bool>, std::int32_t> pictures_; ///< by image and alpha; -1: there is none
};

template <class Archive, class Value>
requires std::is_same_v<std::remove_const_t<Value>, PageMaterial>
void transferMaterial(Archive& archive, Value& material) {
    archive(material.firstTriangle);
    archive(material.triangles);
    archive(material.texture);
    archive(material.colour);
    archive(material.isCutOut);
}

std::string packed(const PageTextures& textures) {
    Packer packer;
    packer(textures.textures);
    packer(textures.notes);
    packer(textures.materials.size());
    for (const PageMaterial& material : textures.materials)
        transferMaterial(packer, material);
    return packer.take();
}

bool areSound(const PageTextures& textures, std::uint32_t triangles) {
    std::uint32_t triangle = 0;
    for (const PageMaterial& material : textures.materials) {
        if (material.firstTriangle != triangle || material.triangles > triangles - triangle || material.texture < -1 ||
            material.texture >= static_cast<std::int64_t>(textures.textures.size()))
            return false;
        triangle += material.triangles;
    }
    return (textures.materials.empty() || triangle == triangles) &&
           std::all_of(textures.textures.begin(), textures.textures.end(), [](const PageTexture& texture) {
               return texture.mime == "image/png" || texture.mime == "image/jpeg";
           });
}

// what comes from the process apart is not trusted
PageTextures unpacked(std::string_view bytes, std::uint32_t triangles) {
    PageTextures textures;
    Unpacker unpacker(bytes);
    unpacker(textures.textures);
    unpacker(textures.notes);
    std::size_t materials = 0;
    unpacker(materials);
    if (materials > triangles)
        throw DamagedAnswer();
    textures.materials.resize(materials);
    for (PageMaterial& material : textures.materials)
        transferMaterial(unpacker, material);
    if (!unpacker.atEnd() || !areSound(textures, triangles))
        throw DamagedAnswer();
    return textures;
}

PageTextures texturesOfFile(const std::string& path, const HObject& mesh, const MeshPolygons& polygons,
                            std::uint32_t textureSize) {
    if (!isGltf(lowerEnding(path)))
        throw std::runtime_error("they are read from glTF files alone");
    std::uint32_t triangles = 0;
    for (const std::uint32_t size : polygons.sizes)
        triangles += size - 2;
    const WantedMesh wanted{nodeName(mesh), readVertexMap(nodeName(mesh)), polygons};
    const std::string bytes = readCharacterBytes(path);
    return unpacked(importApart([&] { return packed(TextureReader(path, bytes, wanted, textureSize).read()); }),
                    triangles);
}

} // namespace

PageTextures gatherTextures(const HObject& mesh, const MeshPolygons& polygons, std::uint32_t textureSize) {
    const std::string path = sourcePath();
    if (path.empty() || polygons.uvs.empty())
        return {};
    try {
        return texturesOfFile(path, mesh, polygons, textureSize);
    } catch (const Interrupted&) {
        throw;
    } catch (const std::runtime_error& error) {
        return {{}, {}, {"the textures of " + fileName(path) + " are not carried over: " + error.what()}};
    }
}

} // namespace quarn
