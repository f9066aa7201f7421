// SPDX-License-Identifier: Apache-2.0
// Everything that decides what rows are, of a training data set or a point cache: they go together when all agrees.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quarn {

inline constexpr const char* setupFile = "setup.json";

/// Things by name, as texts, in the order in which a user should hear of a difference. Thread: one at a time.
class Setup {
public:
    void add(const std::string& thing, const std::string& value) { entries_.emplace_back(thing, value); }
    void add(const std::string& thing, std::size_t value) { add(thing, std::to_string(value)); }

    /// The first thing in which `earlier` differs from this, with both values: "frames 1-40, now 1-50"; empty when they
    /// agree.
    std::string differenceFrom(const Setup& earlier) const;
    /// A JSON object of texts.
    std::string json() const;
    /// None when the file is not there or is no such object.
    static std::optional<Setup> read(const std::filesystem::path& file);

private:
    std::vector<std::pair<std::string, std::string>> entries_;
};

} // namespace quarn
