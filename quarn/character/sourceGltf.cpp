// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/sourceGltf.h"

#include "quarn/character/GltfBytes.h"
#include "quarn/character/filesBeside.h"
#include "quarn/character/gltfContainer.h"
#include "quarn/character/gltfTypes.h"
#include "quarn/character/readApart.h"
#include "quarn/console/interrupt.h"
#include "quarn/process/answerBytes.h"

#include <array>
#include <string_view>
#include <utility>

namespace quarn {
namespace {

template <class Value>
void setMember(JsonValue& object, const char* key, Value value, storage::JsonDocument& document) {
    object.RemoveMember(key);
    object.AddMember(rapidjson::StringRef(key), value, document.GetAllocator());
}

// by the first bytes, as the ending of a name says nothing for sure; empty for what glTF does not know
const char* kindOfPicture(std::string_view bytes) {
    constexpr std::array<std::pair<std::string_view, const char*>, 4> kinds{{{"\x89PNG", "image/png"},
                                                                             {"\xFF\xD8\xFF", "image/jpeg"},
                                                                             {"RIFF", "image/webp"},
                                                                             {"\xABKTX 20\xBB", "image/ktx2"}}};
    for (const auto& [begin, kind] : kinds)
        if (bytes.starts_with(begin))
            return kind;
    return "";
}

class OneBuffer {
public:
    OneBuffer(const std::string& path, std::string_view bytes)
        : path_(path)
        , parts_(gltfParts(bytes))
        , document_(parseGltf(parts_.json))
        , data_(document_, parts_.binary, [&](const std::string& uri) { return readBeside(path, uri, "buffer"); }) {}

    std::string take() {
        for (rapidjson::SizeType view = 0; view < listOf(document_, "bufferViews").Size(); ++view)
            takeView(view);
        takePictures();
        if (!binary_.empty()) {
            JsonValue buffer(rapidjson::kObjectType);
            buffer.AddMember("byteLength", std::uint64_t{binary_.size()}, document_.GetAllocator());
            JsonValue& buffers = arrayMember(document_, "buffers", document_);
            buffers.Clear();
            buffers.PushBack(buffer, document_.GetAllocator());
        }
        forgetMeshopt("extensionsUsed");
        forgetMeshopt("extensionsRequired");
        Packer packer;
        packer(gltfText(document_));
        packer(binary_);
        packer(notes_);
        return packer.take();
    }

private:
    void place(JsonValue& view, std::string_view bytes) {
        data_.charge(bytes.size());
        setMember(view, "buffer", 0, document_);
        setMember(view, "byteOffset", std::uint64_t{binary_.size()}, document_);
        setMember(view, "byteLength", std::uint64_t{bytes.size()}, document_);
        binary_ += bytes;
        binary_.resize((binary_.size() + 3) / 4 * 4);
    }

    void takeView(rapidjson::SizeType index) {
        const std::string_view bytes = data_.view(index);
        JsonValue& view = document_["bufferViews"][index];
        place(view, bytes);
        if (extensionOf(view, meshoptExtension) == nullptr)
            return;
        view["extensions"].RemoveMember(meshoptExtension);
        if (view["extensions"].ObjectEmpty())
            view.RemoveMember("extensions");
    }

    void takePictures() {
        if (member(document_, "images") == nullptr)
            return;
        listOf(document_, "images"); // throws when it is none
        for (JsonValue& image : document_["images"].GetArray())
            if (const std::string uri = textOf(image, "uri"); !uri.empty() && !uri.starts_with("data:"))
                takePicture(image, uri);
    }

    void takePicture(JsonValue& image, const std::string& uri) {
        std::string bytes;
        try {
            bytes = readBeside(path_, uri, "picture");
        } catch (const std::exception& error) {
            notes_.push_back(std::string(error.what()) + ": what is written refers to it, too");
            return;
        }
        const std::string kind = kindOfPicture(bytes);
        if (kind.empty()) {
            notes_.push_back("its picture \"" + uri +
                             "\" is of no kind that a .glb holds: what is written refers to it");
            return;
        }
        JsonValue view(rapidjson::kObjectType);
        place(view, bytes);
        JsonValue& views = arrayMember(document_, "bufferViews", document_);
        setMember(image, "bufferView", views.Size(), document_);
        views.PushBack(view, document_.GetAllocator());
        setMember(image, "mimeType", JsonValue(kind.c_str(), document_.GetAllocator()), document_);
        image.RemoveMember("uri");
    }

    void forgetMeshopt(const char* key) {
        if (listOf(document_, key).Empty())
            return;
        JsonValue& names = document_[key];
        for (auto name = names.Begin(); name != names.End();)
            name = name->IsString() && storage::viewOf(*name) == meshoptExtension ? names.Erase(name) : name + 1;
        if (names.Empty())
            document_.RemoveMember(key);
    }

    const std::string& path_;
    GltfParts parts_;
    storage::JsonDocument document_;
    GltfBytes data_;
    std::string binary_;
    std::vector<std::string> notes_;
};

SourceGltf unpacked(std::string_view bytes) {
    std::string json;
    SourceGltf source;
    Unpacker unpacker(bytes);
    unpacker(json);
    unpacker(source.binary);
    unpacker(source.notes);
    source.document = parseGltf(json);
    return source;
}

} // namespace

SourceGltf readSourceGltf(const std::string& path) {
    try {
        if (!isGltf(lowerEnding(path)))
            throw std::runtime_error("it is no glTF file");
        const std::string bytes = readCharacterBytes(path);
        return unpacked(importApart([&] { return OneBuffer(path, bytes).take(); }));
    } catch (const Interrupted&) {
        throw;
    } catch (const std::bad_alloc&) {
        throw std::runtime_error(path + ": not enough memory for this file");
    } catch (const std::exception& error) {
        throw std::runtime_error(path + ": " + error.what());
    }
}

} // namespace quarn
