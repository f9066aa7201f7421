// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/Setup.h"

#include <algorithm>
#include <map>
#include <stdexcept>

namespace quarn {
namespace {

constexpr const char* noValue = "(none)";

} // namespace

std::optional<Setup::Difference> Setup::firstDifference(const Setup& earlier) const {
    std::map<std::string, std::string> before(earlier.entries_.begin(), earlier.entries_.end());
    for (const auto& [thing, value] : entries_) {
        const auto found = before.find(thing);
        if (found == before.end())
            return Difference{thing, noValue, value};
        if (found->second != value)
            return Difference{thing, found->second, value};
        before.erase(found);
    }
    if (before.empty())
        return {};
    return Difference{before.begin()->first, before.begin()->second, noValue};
}

std::string Setup::differenceFrom(const Setup& earlier) const {
    const std::optional<Difference> found = firstDifference(earlier);
    return found ? found->thing + " " + found->before + ", now " + found->now : "";
}

Setup Setup::without(const std::string& thing) const {
    Setup rest;
    for (const auto& entry : entries_)
        if (entry.first != thing)
            rest.entries_.push_back(entry);
    return rest;
}

Setup Setup::with(const std::string& thing, const std::string& value) const {
    Setup changed = *this;
    for (auto& entry : changed.entries_)
        if (entry.first == thing)
            entry.second = value;
    return changed;
}

std::optional<std::string> Setup::value(const std::string& thing) const {
    const auto found = std::find_if(entries_.begin(), entries_.end(), [&](const auto& e) { return e.first == thing; });
    return found == entries_.end() ? std::nullopt : std::optional(found->second);
}

void Setup::write(JsonWriter& writer) const {
    writer.StartObject();
    for (const auto& [thing, value] : entries_)
        writeText(writer, thing.c_str(), value);
    writer.EndObject();
}

std::string Setup::json() const {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    write(writer);
    return buffer.GetString() + std::string("\n");
}

std::optional<Setup> Setup::from(const storage::JsonValue& object) {
    if (!object.IsObject())
        return {};
    Setup setup;
    for (const auto& member : object.GetObject()) {
        if (!member.value.IsString())
            return {};
        setup.add(member.name.GetString(), std::string(member.value.GetString()));
    }
    return setup;
}

std::optional<Setup> Setup::read(const std::filesystem::path& file) try {
    return from(storage::readJson(file, storage::jsonRules::dataset));
} catch (const std::runtime_error&) { // not there, or damaged
    return {};
}

} // namespace quarn
