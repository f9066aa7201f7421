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

// A case's input that remembers which of its members were read, so that one nobody reads is noticed.
class Input {
public:
    explicit Input(const Json& members)
        : members_(members) {}

    // Throws std::runtime_error when there is no such member.
    const Json& operator[](std::string_view key);

    std::vector<std::string> unread() const;

private:
    const Json& members_;
    std::set<std::string, std::less<>> read_;
};

} // namespace replay
