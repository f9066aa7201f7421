// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/trainerFiles.h"

#include "quarn/console/numberText.h"
#include "storage/Json.h"
#include "storage/readWholeFile.h"

#include <charconv>
#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using storage::JsonValue;

constexpr std::uint64_t mostBytes = std::uint64_t{64} << 20U;

const JsonValue* memberOf(const JsonValue& object, const char* name) {
    return object.IsObject() && object.HasMember(name) ? &object[name] : nullptr;
}

std::optional<std::int64_t> wholeIn(const JsonValue& object, const char* name) {
    const JsonValue* value = memberOf(object, name);
    return value != nullptr && value->IsInt64() ? std::optional(value->GetInt64()) : std::nullopt;
}

std::string textIn(const JsonValue& object, const char* name) {
    const JsonValue* value = memberOf(object, name);
    return value != nullptr && value->IsString() ? std::string(storage::viewOf(*value)) : "";
}

std::string plainText(const JsonValue& value) {
    if (value.IsString())
        return std::string(storage::viewOf(value));
    if (value.IsBool())
        return value.GetBool() ? "yes" : "no";
    return value.IsNumber() ? numberText(value.GetDouble()) : "";
}

// members that are no lists or objects
Facts factsIn(const JsonValue& object, const char* name) {
    Facts facts;
    const JsonValue* all = memberOf(object, name);
    if (all == nullptr || !all->IsObject())
        return facts;
    for (const auto& member : all->GetObject())
        if (std::string text = plainText(member.value); !text.empty())
            facts.emplace_back(storage::viewOf(member.name), std::move(text));
    return facts;
}

storage::JsonDocument readObject(const fs::path& file) {
    storage::JsonDocument document = storage::readJson(file.string(), storage::jsonRules::ledger);
    if (!document.IsObject())
        throw std::runtime_error(file.string() + " is not what the trainer writes: it is no JSON object");
    return document;
}

// "EPOCH,TRAINING,VALIDATION", the last of them empty where nothing was held out
void takeLosses(const std::string& line, const fs::path& file, TrainingRecord& record) {
    const auto number = [&](std::size_t begin, std::size_t end) {
        double value = 0.0;
        const auto [rest, error] = std::from_chars(line.data() + begin, line.data() + end, value);
        if (error != std::errc() || rest != line.data() + end || !std::isfinite(value))
            throw std::runtime_error(file.string() + " has the line \"" + line.substr(0, 80) +
                                     "\", and not an epoch and its losses");
        return value;
    };
    const std::size_t first = line.find(','), second = first == std::string::npos ? first : line.find(',', first + 1);
    if (second == std::string::npos)
        number(0, 0);
    record.training.push_back(number(first + 1, second));
    if (second + 1 < line.size())
        record.validation.push_back(number(second + 1, line.size()));
}

void readLosses(const fs::path& file, TrainingRecord& record) {
    const std::string text = storage::readWholeFile(file, mostBytes);
    std::size_t begin = text.find('\n'); // behind the names
    while (begin != std::string::npos && begin + 1 < text.size()) {
        const std::size_t end = text.find('\n', begin + 1);
        const std::string line = text.substr(begin + 1, end == std::string::npos ? end : end - begin - 1);
        if (!line.empty())
            takeLosses(line, file, record);
        begin = end;
    }
    if (!record.validation.empty() && record.validation.size() != record.training.size())
        throw std::runtime_error(file.string() + " has a loss on what was held out of some epochs only");
}

StageFigures figuresOf(const JsonValue& stage, const std::string& what) {
    StageFigures figures;
    for (const auto& [name, place] : {std::pair("mean", &figures.mean), std::pair("p99", &figures.p99),
                                      std::pair("p9999", &figures.p9999), std::pair("max", &figures.max)}) {
        const JsonValue* value = memberOf(stage, name);
        const JsonValue* length = value == nullptr ? nullptr : memberOf(*value, "mm");
        if (length == nullptr || !length->IsNumber())
            throw std::runtime_error(what + " has no " + name + ": another version of the trainer wrote it, and it " +
                                     "has to be made again");
        *place = length->GetDouble();
    }
    figures.frame = static_cast<int>(wholeIn(stage, "worstFrame").value_or(0));
    figures.vertex = static_cast<std::size_t>(wholeIn(stage, "worstVertex").value_or(0));
    return figures;
}

} // namespace

TrainingRecord readTraining(const fs::path& folder) {
    const storage::JsonDocument report = readObject(folder / "report.json");
    TrainingRecord record;
    record.epochs = wholeIn(report, "epochs");
    record.bestEpoch = wholeIn(report, "bestEpoch");
    record.seed = wholeIn(report, "seed");
    record.threads = wholeIn(report, "threads");
    if (const JsonValue* seconds = memberOf(report, "seconds"); seconds != nullptr && seconds->IsNumber())
        record.seconds = seconds->GetDouble();
    record.device = textIn(report, "device");
    const JsonValue* interrupted = memberOf(report, "interrupted");
    record.isInterrupted = interrupted != nullptr && interrupted->IsBool() && interrupted->GetBool();
    record.versions = factsIn(report, "versions");
    record.settings = factsIn(report, "settings");
    for (const auto& [name, version] : record.versions)
        if (name == "trainer")
            record.trainer = version;
    readLosses(folder / "losses.csv", record);
    return record;
}

Evaluation readEvaluation(const fs::path& file) {
    const storage::JsonDocument answer = readObject(file);
    const JsonValue* base = memberOf(answer, "base");
    if (base == nullptr || !base->IsObject())
        throw std::runtime_error(file.string() + " is no answer of trainer evaluate --json: it has no \"base\"");
    Evaluation evaluation;
    evaluation.zeroDeltas = figuresOf(*base, file.string());
    if (const JsonValue* basis = memberOf(answer, "basis"); basis != nullptr && basis->IsObject())
        evaluation.basis = figuresOf(*basis, file.string());
    return evaluation;
}

} // namespace quarn
