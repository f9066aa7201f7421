// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/recipe.h"

#include "storage/FileError.h"
#include "storage/Json.h"

#include <set>
#include <type_traits>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using storage::JsonValue;

/// One key of a recipe, read into the type of its setting.
class Entry {
public:
    Entry(const fs::path& file, std::string name, const JsonValue& value)
        : file_(file)
        , name_(std::move(name))
        , value_(value) {}

    void read(std::optional<std::int64_t>& number) const {
        if (!value_.IsInt64())
            fail("a whole number");
        number = value_.GetInt64();
    }
    void read(std::optional<double>& number) const {
        if (!value_.IsNumber())
            fail("a number");
        number = value_.GetDouble();
    }
    void read(bool& flag) const {
        if (!value_.IsBool())
            fail("true or false");
        flag = value_.GetBool();
    }
    void read(std::string& text) const { text = textOf(value_); }
    void read(fs::path& path) const { path = textOf(value_); }
    void read(Words& words) const {
        words.clear();
        if (value_.IsString())
            return words.push_back(textOf(value_));
        if (!value_.IsArray())
            fail("a text, or a list of texts");
        for (const JsonValue& word : value_.GetArray())
            words.push_back(textOf(word));
    }

private:
    std::string textOf(const JsonValue& value) const {
        if (!value.IsString() || value.GetStringLength() == 0)
            fail("a text");
        return std::string(storage::viewOf(value));
    }
    [[noreturn]] void fail(const char* wanted) const {
        throw storage::FileError(file_, "has a \"" + name_ + "\" that is not " + wanted);
    }

    const fs::path& file_;
    std::string name_;
    const JsonValue& value_;
};

// Flags of the commands that load no code, start nothing and write nowhere else. Whoever has not written the recipe
// knows then that it does not either; others need --allow-commands.
const std::set<std::string> harmless = {
    // clang-format off
    "--activation", "--align", "--animation", "--anyway", "--axes", "--basis-budget", "--batch-size",
    "--checkpoint-every", "--controls", "--delta-mode", "--device", "--direct", "--dropout", "--epochs", "--fps",
    "--frame-offset", "--frames", "--guard", "--guard-width", "--half-shapes", "--hidden-layers", "--judge",
    "--learning-rate", "--limit-max", "--limit-mean", "--limits-from", "--limits-margin", "--linear-path",
    "--local-neurons", "--meters-per-unit", "--neurons", "--no-animation", "--no-preload", "--no-viewer", "--order",
    "--patience", "--pictures", "--preload", "--principal-accuracy", "--principal-limit", "--principal-shapes",
    "--range", "--repeat", "--rest-frame", "--scale", "--seed", "--size", "--smoothing", "--start", "--start-frame",
    "--threads", "--title", "--tolerance", "--up", "--validation-ratio", "--view", "--with-roots",
    // clang-format on
};

// "-1.5" is none
bool isFlag(const std::string& word) {
    return word.size() > 1 && word.front() == '-' && word.find_first_of("0123456789.") != 1;
}

void requireHarmless(const fs::path& file, const std::string& name, const Words& words) {
    for (const std::string& word : words)
        if (isFlag(word) && harmless.count(word.substr(0, word.find('='))) == 0)
            throw storage::FileError(file, "has \"" + word + "\" among its \"" + name +
                                               "\", which might load code or " +
                                               "write elsewhere: --allow-commands lets it");
}

class Recipe {
public:
    explicit Recipe(const fs::path& file)
        : file_(file)
        , document_(storage::readJson(file.string(), storage::jsonRules::recipe)) {
        if (!document_.IsObject())
            throw storage::FileError(file, "is no recipe: not an object of JSON");
    }

    template <class Member>
    void take(const char* name, Member& member) {
        known_.insert(name);
        if (has(name))
            Entry(file_, name, document_[name]).read(member);
    }
    bool has(const char* name) const { return document_.HasMember(name); }
    void requireAllKnown() const {
        for (const auto& member : document_.GetObject())
            if (const std::string name(storage::viewOf(member.name)); known_.count(name) == 0)
                throw storage::FileError(file_, "has the key \"" + name + "\", which no recipe has; keys are the " +
                                                    "flags of quarn run, without their dashes, and \"character\"");
    }

private:
    const fs::path& file_;
    storage::JsonDocument document_;
    std::set<std::string> known_;
};

} // namespace

void readRecipe(const fs::path& file, RunSettings& settings, const std::function<bool(const std::string&)>& isGiven,
                bool allowCommands) {
    Recipe recipe(file);
    if (recipe.has("target-command") && !allowCommands)
        throw storage::FileError(file, "would start a program (\"target-command\"): --allow-commands lets it");
    RunSettings own;
    recipe.take("character", own.character);
    recipe.take("target-command", own.targetCommand);
    visitSettings([&](const char* name, auto member, auto...) {
        recipe.take(name, own.*member);
        if constexpr (std::is_same_v<decltype(member), Words RunSettings::*>)
            if (!allowCommands && std::string(name).find("-option") != std::string::npos)
                requireHarmless(file, name, own.*member);
    });
    recipe.requireAllKnown();
    resolve(own, file.parent_path());
    const auto adopt = [&](const char* name, auto member, auto...) {
        if (!isGiven(name))
            settings.*member = std::move(own.*member);
    };
    adopt("character", &RunSettings::character);
    adopt("target-command", &RunSettings::targetCommand);
    visitSettings(adopt);
}

} // namespace quarn
