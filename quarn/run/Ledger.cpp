// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/Ledger.h"

#include "quarn/console/json.h"
#include "storage/FileError.h"
#include "storage/Fnv64.h"
#include "storage/Json.h"
#include "storage/WholeFile.h"

#include <algorithm>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using storage::JsonValue;
using Sums = std::map<std::string, std::string>;

constexpr const char* format = "quarn run";
constexpr std::int64_t formatVersion = 1;

// "--samples 40, was --samples 20": the first word that differs, with the flag before it
std::string differenceOf(const Words& now, const Words& before) {
    const auto [a, b] = std::mismatch(now.begin(), now.end(), before.begin(), before.end());
    const auto shown = [](const Words& words, Words::const_iterator at) -> std::string {
        if (at == words.end())
            return "no more";
        const bool hasFlag = at != words.begin() && at->front() != '-' && (at - 1)->rfind("--", 0) == 0;
        return (hasFlag ? *(at - 1) + " " : std::string()) + *at;
    };
    return shown(now, a) + ", was " + shown(before, b);
}

std::string differenceOf(const Sums& now, const Sums& before, const char* what) {
    for (const auto& [file, sum] : now) {
        const auto found = before.find(file);
        if (found == before.end())
            return std::string(what) + " " + file + " is new";
        if (found->second != sum)
            return std::string(what) + " " + file + (sum.empty() ? " is not there" : " has changed");
    }
    for (const auto& [file, sum] : before)
        if (now.count(file) == 0)
            return std::string(what) + " " + file + " is none any more";
    return {};
}

// an input that was an output before, and other than it is now; or nothing
std::string editedBetween(const Sums& outputs, const Sums& inputs) {
    const auto found = std::find_if(inputs.begin(), inputs.end(), [&](const auto& input) {
        const auto made = outputs.find(input.first);
        return made != outputs.end() && made->second != input.second;
    });
    return found == inputs.end() ? std::string() : found->first;
}

// the file that an argument names by its whole path, also as "--flag=FILE"; or nothing
std::string fileOf(const std::string& word) {
    const std::size_t begin = word.rfind('/', 0) == 0 ? 0 : word.find("=/") + 1;
    std::error_code error;
    if (word.rfind('/', 0) != 0 && begin == 0)
        return {};
    const std::string file = word.substr(begin);
    return fs::is_regular_file(file, error) ? file : std::string();
}

void writeSums(JsonWriter& writer, const char* key, const Sums& sums) {
    writer.Key(key);
    writer.StartObject();
    for (const auto& [file, sum] : sums)
        writeText(writer, file.c_str(), sum);
    writer.EndObject();
}

/// Values of run.json, each of which may be missing in a file that somebody has changed.
class Reader {
public:
    explicit Reader(const fs::path& file)
        : file_(file) {}

    const JsonValue& member(const JsonValue& object, const char* name) const {
        if (!object.IsObject() || !object.HasMember(name))
            fail();
        return object[name];
    }
    std::string text(const JsonValue& value) const {
        if (!value.IsString())
            fail();
        return std::string(storage::viewOf(value));
    }
    std::int64_t number(const JsonValue& value) const {
        if (!value.IsInt64())
            fail();
        return value.GetInt64();
    }
    template <class Take>
    void each(const JsonValue& object, const Take& take) const {
        if (!object.IsObject())
            fail();
        for (const auto& entry : object.GetObject())
            take(text(entry.name), entry.value);
    }
    Sums sums(const JsonValue& object) const {
        Sums sums;
        each(object, [&](const std::string& file, const JsonValue& sum) { sums[file] = text(sum); });
        return sums;
    }
    Words words(const JsonValue& list) const {
        if (!list.IsArray())
            fail();
        Words words;
        for (const JsonValue& word : list.GetArray())
            words.push_back(text(word));
        return words;
    }
    [[noreturn]] void fail() const {
        throw storage::FileError(file_,
                                 "is not what a quarn run of this version has written: give another folder, or " +
                                     std::string("remove the file to have every step done again"));
    }

private:
    const fs::path& file_;
};

} // namespace

Ledger::Ledger(const fs::path& folder)
    : folder_(folder)
    , sums_(folder) {
    std::error_code error;
    if (fs::exists(folder_ / fileName, error))
        read();
}

void Ledger::read() {
    const fs::path file = folder_ / fileName;
    const Reader reader(file);
    const storage::JsonDocument document = storage::readJson(file.string(), storage::jsonRules::ledger);
    if (reader.text(reader.member(document, "format")) != format ||
        reader.number(reader.member(document, "version")) != formatVersion)
        reader.fail();
    reader.each(reader.member(document, "steps"), [&](const std::string& label, const JsonValue& value) {
        entries_[label] = {reader.words(reader.member(value, "words")), reader.text(reader.member(value, "program")),
                           reader.sums(reader.member(value, "inputs")), reader.sums(reader.member(value, "outputs"))};
    });
    reader.each(reader.member(document, "files"), [&](const std::string& path, const JsonValue& value) {
        sums_.seen[path] = {reader.text(reader.member(value, "sum")),
                            static_cast<std::uint64_t>(reader.number(reader.member(value, "bytes"))),
                            reader.number(reader.member(value, "changed"))};
    });
}

void Ledger::save() const {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "format", format);
    writeCount(writer, "version", formatVersion);
    writer.Key("steps");
    writer.StartObject();
    for (const auto& [label, entry] : entries_) {
        if (!entry.isDone())
            continue;
        writer.Key(label.c_str());
        writer.StartObject();
        writer.Key("words");
        writer.StartArray();
        for (const std::string& word : entry.words)
            writeText(writer, word);
        writer.EndArray();
        writeText(writer, "program", entry.version);
        writeSums(writer, "inputs", entry.inputs);
        writeSums(writer, "outputs", entry.outputs);
        writer.EndObject();
    }
    writer.EndObject();
    writer.Key("files");
    writer.StartObject();
    for (const auto& [path, seen] : sums_.seen) {
        writer.Key(path.c_str());
        writer.StartObject();
        writeText(writer, "sum", seen.sum);
        writeCount(writer, "bytes", seen.bytes);
        writer.Key("changed");
        writer.Int64(seen.changed);
        writer.EndObject();
    }
    writer.EndObject();
    writer.EndObject();
    storage::writeWhole(folder_ / fileName, std::string(buffer.GetString()) + "\n");
}

Ledger::Entry Ledger::entryOf(const Step& step, const std::string& version) {
    Entry entry{step.words, version, {}, {}};
    for (const fs::path& input : step.inputs)
        entry.inputs[input.string()] = sums_.of(input);
    // files that arguments name, as a script, are as much part of what a step makes as the arguments
    for (const std::string& word : step.words)
        if (const std::string file = fileOf(word); !file.empty())
            entry.inputs[file] = sums_.of(file);
    return entry;
}

std::string Ledger::whyToDo(const Step& step, const std::string& version) {
    const auto found = entries_.find(step.label());
    if (found == entries_.end() || !found->second.isDone())
        return "it was not done yet";
    const Entry& before = found->second;
    const Entry now = entryOf(step, version);
    if (now.version != before.version)
        return "its program is " + now.version + ", was " + before.version;
    if (const std::string file = editedBetween(before.outputs, now.inputs); !file.empty())
        return file + ", which it had made, was edited, and is taken as it is";
    if (now.words != before.words)
        return "its arguments are others: " + differenceOf(now.words, before.words);
    if (std::string difference = differenceOf(now.inputs, before.inputs, "its input"); !difference.empty())
        return difference;
    Sums outputs;
    for (const fs::path& output : step.outputs)
        outputs[output.string()] = sums_.of(output);
    return differenceOf(outputs, before.outputs, "its output");
}

void Ledger::begin(const Step& step, const std::string& version) {
    Entry entry = entryOf(step, version);
    for (const fs::path& input : step.inputs)
        if (const auto found = entry.inputs.find(input.string()); found != entry.inputs.end() && found->second.empty())
            throw std::runtime_error((folder_ / input).lexically_normal().string() + ", which " + step.label() +
                                     " needs, is not there");
    entries_[step.label()] = std::move(entry);
}

void Ledger::finish(const Step& step) {
    Entry& entry = entries_[step.label()];
    for (const fs::path& output : step.outputs) {
        std::string& sum = entry.outputs[output.string()] = sums_.of(output);
        if (sum.empty()) {
            entry.outputs.clear();
            throw std::runtime_error(step.label() + " has not written " + (folder_ / output).string());
        }
    }
    save();
}

bool Ledger::isForeign(const fs::path& file) {
    const std::string sum = sums_.of(file);
    return !sum.empty() && std::none_of(entries_.begin(), entries_.end(), [&](const auto& labelled) {
        const Sums& outputs = labelled.second.outputs;
        const auto found = outputs.find(file.string());
        return found != outputs.end() && found->second == sum;
    });
}

std::string Ledger::digestOf(const Step& step, const std::string& version) {
    const Entry entry = entryOf(step, version);
    storage::Fnv64 sum;
    const auto add = [&](const std::string& text) { sum.add(std::as_bytes(std::span(text.c_str(), text.size() + 1))); };
    add(entry.version);
    std::for_each(entry.words.begin(), entry.words.end(), add);
    for (const auto& [file, value] : entry.inputs) {
        add(file);
        add(value);
    }
    return sum.text();
}

} // namespace quarn
