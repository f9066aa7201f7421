// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <rapidjson/document.h>

#include <filesystem>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace replay {

using Json = rapidjson::Value;
using JsonAllocator = rapidjson::Document::AllocatorType;

// One reference case: what went in, what an independent reference says must come out, and how exactly.
struct Case {
    std::string name;
    std::string kind;
    std::filesystem::path folder; // absolute, of its file
    double tolerance = 0.0;
    rapidjson::Document document; // owns input and expected

    const Json& input() const { return document["input"]; }
    Json& expected() { return document["expected"]; }
    const Json& expected() const { return document["expected"]; }
};

// Reads one case. Throws std::runtime_error that names the file and what is wrong with it.
Case readCase(const std::filesystem::path& file);

// Every case of a folder (files "*.json", by name). Throws std::runtime_error for the first that cannot be read.
std::vector<Case> readCases(const std::filesystem::path& folder);

// The members of a case's input, or of an object in it, that remembers which of them were read, so that one nobody
// reads is noticed.
class Input {
public:
    // `folder` of the case's file. Throws std::runtime_error when `members` is no object.
    explicit Input(const Json& members, std::filesystem::path folder = {});

    // Throws std::runtime_error when there is no such member.
    const Json& operator[](std::string_view key);
    // Null when there is no such member.
    const Json* find(std::string_view key);

    std::vector<std::string> unread() const;
    const std::filesystem::path& folder() const { return folder_; }

private:
    const Json& members_;
    std::filesystem::path folder_;
    std::set<std::string, std::less<>> read_;
};

} // namespace replay
