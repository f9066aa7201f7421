// SPDX-License-Identifier: Apache-2.0
#include "json.h"

#include "printLine.h"

#include <exception>
#include <ios>

namespace neuralWarp::json {

bool open(std::filebuf& file, const std::filesystem::path& path, const storage::JsonRules& rules) {
    std::error_code error;
    // A pipe would wait for a writer, and a directory opens on Linux but cannot be read.
    if (!std::filesystem::is_regular_file(path, error) || !file.open(path, std::ios::in)) {
        printLine("Failed to open metadata file stream\n");
        return false;
    }
    const std::uintmax_t size = std::filesystem::file_size(path, error);
    if (!error && size > rules.mostBytes) {
        return refuse(path, "the file is larger than " + std::to_string(rules.mostBytes) + " bytes");
    }
    return true;
}

bool parseObject(Document& document, std::streambuf& source, const std::filesystem::path& path,
                 const storage::JsonRules& rules) {
    if (!storage::parseJson(document, source, rules)) {
        printLine("Parse error\n");
        return false;
    }
    return document.IsObject() || refuse(path, "it holds no JSON object");
}

bool refuse(const std::filesystem::path& path, const char* reason) noexcept {
    printLine({"Error: ", path.c_str(), ": ", reason, "\n"});
    return false;
}

bool refuse(const std::filesystem::path& path, const std::string& reason) noexcept {
    return refuse(path, reason.c_str());
}

bool refuseByException(const std::filesystem::path& path) noexcept {
    try {
        throw;
    } catch (const std::bad_alloc&) {
        return refuse(path, "out of memory");
    } catch (const std::exception& error) {
        return refuse(path, error.what());
    } catch (...) {
        return refuse(path, "unknown error");
    }
}

const Value* find(const Value& object, const char* key) {
    const auto member = object.FindMember(key);
    return member == object.MemberEnd() ? nullptr : &member->value;
}

std::uint32_t readUint(const Value& object, const char* key, std::uint32_t fallback) {
    const Value* value = find(object, key);
    return value != nullptr && value->IsUint() ? value->GetUint() : fallback;
}

std::string readText(const Value& object, const char* key) {
    const Value* value = find(object, key);
    return value != nullptr && value->IsString() ? std::string(value->GetString(), value->GetStringLength())
                                                 : std::string();
}

} // namespace neuralWarp::json
