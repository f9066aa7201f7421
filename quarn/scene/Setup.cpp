// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/Setup.h"

#include "quarn/console/json.h"
#include "storage/Json.h"

#include <map>
#include <stdexcept>

namespace quarn {
namespace {

std::string difference(const std::string& thing, const std::string& before, const std::string& now) {
    return thing + " " + before + ", now " + now;
}

} // namespace

std::string Setup::differenceFrom(const Setup& earlier) const {
    std::map<std::string, std::string> before(earlier.entries_.begin(), earlier.entries_.end());
    for (const auto& [thing, value] : entries_) {
        const auto found = before.find(thing);
        if (found == before.end())
            return difference(thing, "(none)", value);
        if (found->second != value)
            return difference(thing, found->second, value);
        before.erase(found);
    }
    return before.empty() ? "" : difference(before.begin()->first, before.begin()->second, "(none)");
}

std::string Setup::json() const {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    for (const auto& [thing, value] : entries_)
        writeText(writer, thing.c_str(), value);
    writer.EndObject();
    return buffer.GetString() + std::string("\n");
}

std::optional<Setup> Setup::read(const std::filesystem::path& file) try {
    const storage::JsonDocument json = storage::readJson(file, storage::jsonRules::dataset);
    if (!json.IsObject())
        return {};
    Setup setup;
    for (const auto& member : json.GetObject()) {
        if (!member.value.IsString())
            return {};
        setup.add(member.name.GetString(), std::string(member.value.GetString()));
    }
    return setup;
} catch (const std::runtime_error&) { // not there, or damaged
    return {};
}

} // namespace quarn
