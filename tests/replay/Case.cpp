// SPDX-License-Identifier: Apache-2.0
#include "Case.h"

#include <rapidjson/error/en.h>
#include <rapidjson/istreamwrapper.h>

#include <algorithm>
#include <fstream>
#include <stdexcept>

namespace replay {
namespace {

// The reference writes doubles with 17 digits; they must come back to the bit.
constexpr unsigned parseFlags =
    rapidjson::kParseFullPrecisionFlag | rapidjson::kParseIterativeFlag | rapidjson::kParseNanAndInfFlag;

void require(bool holds, const std::filesystem::path& file, const std::string& what) {
    if (!holds)
        throw std::runtime_error(file.string() + ": " + what);
}

} // namespace

Case readCase(const std::filesystem::path& file) {
    std::ifstream stream(file, std::ios::binary);
    require(stream.is_open(), file, "cannot be opened");
    rapidjson::IStreamWrapper wrapper(stream);
    Case result;
    rapidjson::Document& document = result.document;
    document.ParseStream<parseFlags>(wrapper);
    require(!document.HasParseError(), file, rapidjson::GetParseError_En(document.GetParseError()));
    require(document.IsObject() && document.MemberCount() == 5, file, "is not an object of five members");
    for (const char* key : {"case", "kind", "tolerance", "input", "expected"})
        require(document.HasMember(key), file, std::string("has no \"") + key + '"');
    require(document["case"].IsString() && document["kind"].IsString() && document["tolerance"].IsNumber() &&
                document["input"].IsObject(),
            file, "has a member of the wrong type");
    result.name = document["case"].GetString();
    result.kind = document["kind"].GetString();
    result.folder = std::filesystem::absolute(file).lexically_normal().parent_path();
    result.tolerance = document["tolerance"].GetDouble();
    return result;
}

std::vector<Case> readCases(const std::filesystem::path& folder) {
    std::vector<std::filesystem::path> files;
    for (const auto& entry : std::filesystem::directory_iterator(folder))
        if (entry.path().extension() == ".json")
            files.push_back(entry.path());
    std::sort(files.begin(), files.end());
    std::vector<Case> cases;
    cases.reserve(files.size());
    for (const auto& file : files)
        cases.push_back(readCase(file));
    return cases;
}

Input::Input(const Json& members, std::filesystem::path folder)
    : members_(members)
    , folder_(std::move(folder)) {
    if (!members.IsObject())
        throw std::runtime_error("what should be an object is none");
}

const Json& Input::operator[](std::string_view key) {
    const Json* value = find(key);
    if (!value)
        throw std::runtime_error("there is no \"" + std::string(key) + '"');
    return *value;
}

const Json* Input::find(std::string_view key) {
    const auto member = members_.FindMember(Json(key.data(), static_cast<rapidjson::SizeType>(key.size())));
    if (member == members_.MemberEnd())
        return nullptr;
    read_.emplace(key);
    return &member->value;
}

std::vector<std::string> Input::unread() const {
    std::vector<std::string> keys;
    for (const auto& member : members_.GetObject())
        if (!read_.contains(std::string_view(member.name.GetString())))
            keys.emplace_back(member.name.GetString());
    return keys;
}

} // namespace replay
