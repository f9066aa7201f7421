// SPDX-License-Identifier: Apache-2.0
// Everything that decides what rows are, of a training data set or a point cache: they go together when all agrees.
#pragma once

#include "quarn/console/json.h"
#include "storage/Json.h"

#include <filesystem>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quarn {

inline constexpr const char* setupFile = "setup.json";

/// Entries that say which rows there are, and not what they are: all frames, and those of a part of them.
namespace setupEntry {
inline constexpr const char* frames = "frames";
inline constexpr const char* part = "part";
} // namespace setupEntry

/// Things by name, as texts, in the order in which a user should hear of a difference. Thread: one at a time.
class Setup {
public:
    void add(const std::string& thing, const std::string& value) { entries_.emplace_back(thing, value); }
    void add(const std::string& thing, std::size_t value) { add(thing, std::to_string(value)); }

    struct Difference {
        std::string thing, before, now; ///< "(none)" where one has none
    };
    /// The first thing in which `earlier` differs from this; none when they agree.
    std::optional<Difference> firstDifference(const Setup& earlier) const;
    /// The same as text: "frames 1-40, now 1-50"; empty when they agree.
    std::string differenceFrom(const Setup& earlier) const;
    /// The same without the entries of a name.
    Setup without(const std::string& thing) const;
    /// With another value for an entry, in its place.
    Setup with(const std::string& thing, const std::string& value) const;
    /// None without such an entry.
    std::optional<std::string> value(const std::string& thing) const;

    /// A JSON object of texts.
    std::string json() const;
    void write(JsonWriter& writer) const;
    /// None when the file is not there or is no such object.
    static std::optional<Setup> read(const std::filesystem::path& file);
    static std::optional<Setup> from(const storage::JsonValue& object);

private:
    std::vector<std::pair<std::string, std::string>> entries_;
};

} // namespace quarn
