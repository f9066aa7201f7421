// SPDX-License-Identifier: Apache-2.0
#include "nw_model/ModelMetadata.h"

#include <algorithm>
#include <utility>

#include "json.h"
#include "readers.h"

namespace neuralWarp {
namespace {

static_assert(storage::jsonRules::modelMetadata.mostBytes == metadataFileLimit);

SubsetState toSubsetState(const std::string& text) {
    if (text == "empty") {
        return SubsetState::Empty;
    }
    if (text == "complete") {
        return SubsetState::Complete;
    }
    return text == "partial" ? SubsetState::Partial : SubsetState::Unrecognized;
}

std::vector<std::uint32_t> readAffectMap(const json::Value& root) {
    const json::Value* list = json::find(root, "affectMap");
    if (list == nullptr || !list->IsArray()) {
        return {};
    }
    if (!std::all_of(list->Begin(), list->End(), [](const json::Value& index) { return index.IsUint(); })) {
        return {};
    }
    std::vector<std::uint32_t> indices(list->Size());
    std::transform(list->Begin(), list->End(), indices.begin(),
                   [](const json::Value& index) { return index.GetUint(); });
    return indices;
}

} // namespace

bool readMetadata(ModelMetadata& record, std::streambuf& source, const std::filesystem::path& path) {
    json::Document root;
    if (!json::parseObject(root, source, path, storage::jsonRules::modelMetadata)) {
        return false;
    }
    ModelMetadata read; // the record must not be left half filled when memory runs out
    read.deltaCount = json::readUint(root, "deltaCount", 0);
    read.deltaMode = json::readUint(root, "deltaMode", 1);
    read.smoothingIterations = json::readUint(root, "smoothingIterations", 0);
    read.affectCount = json::readUint(root, "affectCount", 0);
    read.fullCount = json::readUint(root, "fullCount", 0);
    read.subsetState = toSubsetState(json::readText(root, "subsetState"));
    read.componentTagExpression = json::readText(root, "componentTagExpression");
    read.geometry = json::readText(root, "geometry");
    read.affectMap = readAffectMap(root);
    read.loaded = true;
    record = std::move(read);
    return true;
}

bool readMetadataFile(ModelMetadata& record, const std::filesystem::path& path) noexcept {
    try {
        std::filebuf file;
        return json::open(file, path, storage::jsonRules::modelMetadata) && readMetadata(record, file, path);
    } catch (...) {
        return json::refuseByException(path);
    }
}

} // namespace neuralWarp
