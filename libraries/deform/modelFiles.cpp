// SPDX-License-Identifier: Apache-2.0
#include "modelFiles.h"

#include "nw_deform/BasisSink.h"
#include "nw_deform/Model.h"
#include "nw_model/CaughtLines.h"
#include "storage/FileError.h"
#include "storage/readWholeFile.h"

#include <algorithm>
#include <stdexcept>
#include <system_error>

namespace neuralWarp {
namespace {

namespace fs = std::filesystem;

[[noreturn]] void refuse(const fs::path& path, const std::string& reason) {
    throw std::invalid_argument("'" + path.string() + "' cannot be used: " + reason);
}

std::string withoutLastLineFeed(std::string text) {
    if (!text.empty() && text.back() == '\n')
        text.pop_back();
    return text;
}

fs::file_type typeOf(const fs::path& path) {
    std::error_code error;
    const fs::file_type type = fs::status(path, error).type();
    if (type == fs::file_type::none)
        refuse(path, error.message());
    return type;
}

void checkExists(const fs::path& file) {
    if (typeOf(file) == fs::file_type::not_found)
        throw FileMissing("the model has no '" + file.filename().string() + "': '" + file.string() +
                          "' does not exist");
}

} // namespace

void checkDirectory(const fs::path& directory) {
    const fs::file_type type = typeOf(directory);
    if (type == fs::file_type::not_found)
        throw FileMissing("the model directory '" + directory.string() + "' does not exist");
    if (type != fs::file_type::directory)
        refuse(directory, "a model is a directory");
}

std::string readMetadataText(const fs::path& file) {
    checkExists(file);
    try {
        return storage::readWholeFile(file, metadataFileLimit);
    } catch (const storage::FileError& error) {
        throw std::invalid_argument(error.what());
    }
}

ModelMetadata readGoodMetadata(const fs::path& file) {
    const CaughtLines lines;
    ModelMetadata metadata;
    if (!readMetadataFile(metadata, file))
        refuse(file, withoutLastLineFeed(lines.text()));
    if (metadata.deltaMode > kSurfaceMode)
        refuse(file, "deltaMode is " + std::to_string(metadata.deltaMode) + ", and may be 0 (Offset) or 1 (Surface)");
    const auto& map = metadata.affectMap;
    const auto beyond = std::find_if(map.begin(), map.end(), [&](auto vertex) { return vertex >= metadata.fullCount; });
    if (beyond != map.end())
        refuse(file, "it drives vertex " + std::to_string(*beyond) + ", and its mesh has " +
                         std::to_string(metadata.fullCount) + " vertices");
    return metadata;
}

std::unique_ptr<ModelSession> openSession(const fs::path& file) {
    checkExists(file);
    const CaughtLines lines;
    auto session = std::make_unique<ModelSession>();
    session->load(file, true);
    if (!session->isLoaded())
        refuse(file, session->errorText());
    return session;
}

PrincipalShapesAnswer readBasis(const fs::path& directory, PrincipalBasis& basis) {
    const fs::path file = directory / "principal_shapes.json";
    PrincipalShapesAnswer answer;
    if (typeOf(file) == fs::file_type::not_found)
        return answer;
    const CaughtLines lines;
    BasisSink sink(basis);
    if (!readPrincipalBasis(directory, sink, answer))
        refuse(file, withoutLastLineFeed(lines.text()));
    basis.share();
    return answer;
}

} // namespace neuralWarp
