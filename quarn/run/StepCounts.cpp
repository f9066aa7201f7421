// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/StepCounts.h"

#include "quarn/console/Console.h"
#include "storage/Descriptor.h"
#include "storage/Json.h"

#include <array>
#include <regex>

#include <fcntl.h>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using storage::JsonValue;

// a string, a count, a number; null where there is none
const JsonValue* member(const JsonValue& object, const char* name, bool (JsonValue::*is)() const) {
    const bool isThere = object.IsObject() && object.HasMember(name) && (object[name].*is)();
    return isThere ? &object[name] : nullptr;
}

std::optional<StepCounts> countsOfFile(const fs::path& file) {
    try {
        const storage::JsonDocument document = storage::readJson(file.string(), storage::jsonRules::ledger);
        const JsonValue* what = member(document, "what", &JsonValue::IsString);
        const JsonValue* done = member(document, "done", &JsonValue::IsUint64);
        const JsonValue* total = member(document, "total", &JsonValue::IsUint64);
        if (what == nullptr || done == nullptr || total == nullptr)
            return {};
        StepCounts counts{std::string(storage::viewOf(*what)), done->GetUint64(), total->GetUint64(), {}};
        if (const JsonValue* left = member(document, "secondsLeft", &JsonValue::IsNumber))
            counts.secondsLeft = left->GetDouble();
        return counts;
    } catch (const std::exception&) {
        return {}; // a step that has none
    }
}

std::string endOfFile(const fs::path& path) {
    std::error_code error;
    const std::uintmax_t size = fs::file_size(path, error);
    const storage::Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    std::array<std::byte, 512> bytes{};
    const std::ptrdiff_t count =
        error ? 0 : storage::readAt(file.number(), size > bytes.size() ? size - bytes.size() : 0, bytes);
    std::string text;
    for (std::ptrdiff_t i = 0; i < count; ++i)
        text += static_cast<char>(bytes.at(static_cast<std::size_t>(i)));
    return text;
}

// the last "N of M"; numbers of 18 digits are none that something was counted by
StepCounts countsOfLog(const std::string& text) {
    static const std::regex pattern("\\b([0-9]{1,18}) of ([0-9]{1,18})\\b");
    StepCounts counts;
    for (std::sregex_iterator at(text.begin(), text.end(), pattern), end; at != end; ++at)
        counts = {"", std::stoull(at->str(1)), std::stoull(at->str(2)), {}};
    return counts;
}

} // namespace

StepCounts countsIn(const fs::path& progress, const fs::path& log) {
    const std::optional<StepCounts> counts = countsOfFile(progress);
    return counts ? *counts : countsOfLog(endOfFile(log));
}

std::string textOf(const StepCounts& counts) {
    if (counts.total == 0)
        return "";
    return (counts.what.empty() ? "" : counts.what + " ") + std::to_string(counts.done) + " of " +
           std::to_string(counts.total) +
           (counts.secondsLeft ? ", " + durationText(*counts.secondsLeft) + " left" : "");
}

} // namespace quarn
