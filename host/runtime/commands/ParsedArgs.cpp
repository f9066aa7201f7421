// SPDX-License-Identifier: Apache-2.0
#include "commands/ParsedArgs.h"

#include "commands/WordValues.h"
#include "core/Object.h"
#include "core/apiCall.h"

#include <algorithm>

namespace OpenQuarn {
namespace {

HStatus failure(const std::string& text) {
    return {HStatus::kFailure, text};
}

template <class Value>
HStatus readable(const std::string& word) {
    Value value{};
    return readWord(word, value);
}

HStatus checkType(HSyntax::ArgType type, const std::string& word) {
    switch (type) {
    case HSyntax::kBoolean:
        return readable<bool>(word);
    case HSyntax::kLong:
        return readable<int>(word);
    case HSyntax::kUnsigned:
        return readable<unsigned>(word);
    case HSyntax::kDouble:
        return readable<double>(word);
    default:
        return {};
    }
}

class Parser {
public:
    Parser(const HArgList& words, ParsedArgs& parsed)
        : words_(words)
        , parsed_(parsed)
        , syntax_(parsed.syntax) {}

    HStatus parse() {
        findModes();
        while (next_ < size())
            if (HStatus status = isFlag(next_) ? flag() : argument(); status.error())
                return status;
        return checkNumbers();
    }

private:
    const auto& word(std::size_t index) const { return Access::impl(words_)[index]; }
    const std::string& text(std::size_t index) const { return word(index).text.asStdString(); }
    std::size_t size() const { return Access::impl(words_).size(); }
    bool isFlag(std::size_t index) const { return !word(index).quoted && looksLikeFlag(text(index)); }

    bool isQueryFlag(std::size_t index) const {
        return syntax_.hasQuery && isFlag(index) && (text(index) == "-q" || text(index) == "-query");
    }
    bool isEditFlag(std::size_t index) const {
        return syntax_.hasEdit && isFlag(index) && (text(index) == "-e" || text(index) == "-edit");
    }

    // -q may stand behind the flags whose arguments it takes away
    void findModes() {
        for (std::size_t i = 0; i < size(); ++i) {
            parsed_.isQuery = parsed_.isQuery || isQueryFlag(i);
            parsed_.isEdit = parsed_.isEdit || isEditFlag(i);
        }
    }

    HStatus flag() {
        const std::size_t at = next_++;
        if (isQueryFlag(at) || isEditFlag(at))
            return {};
        const std::size_t index = flagIndex(syntax_, text(at));
        if (index == noFlag)
            return failure("unknown flag " + inQuotes(text(at)));
        const SyntaxFlag& flag = syntax_.flags[index];
        const bool isRepeated = std::any_of(parsed_.uses.begin(), parsed_.uses.end(),
                                            [&](const FlagUse& use) { return use.flag == index; });
        if (isRepeated && !flag.isMultiUse)
            return failure("flag '-" + flag.longName + "' is given more than once");
        parsed_.uses.push_back({index, {}});
        return parsed_.isQuery ? HStatus() : flagArguments(flag, parsed_.uses.back().args);
    }

    HStatus flagArguments(const SyntaxFlag& flag, HArgList& args) {
        for (std::size_t i = 0; i < flag.types.size(); ++i, ++next_) {
            const std::string which =
                "flag '-" + flag.longName + "', argument " + std::to_string(i + 1) + " (" + argTypeName(flag.types[i]);
            if (next_ == size() || isFlag(next_))
                return failure(which + ") is missing");
            if (const HStatus status = checkType(flag.types[i], text(next_)); status.error())
                return failure(which + "): " + status.errorString().asChar());
            Access::impl(args).push_back(word(next_));
        }
        return {};
    }

    HStatus argument() {
        const std::size_t at = next_++;
        const std::size_t index = parsed_.args.length();
        if (index >= syntax_.args.size())
            return object(at);
        if (const HStatus status = checkType(syntax_.args[index], text(at)); status.error())
            return failure("argument " + std::to_string(index + 1) + " (" + argTypeName(syntax_.args[index]) +
                           "): " + status.errorString().asChar());
        Access::impl(parsed_.args).push_back(word(at));
        return {};
    }

    HStatus object(std::size_t at) {
        if (syntax_.objects == HSyntax::kNone || parsed_.objects.length() >= syntax_.maximumObjects)
            return failure("too many arguments: " + inQuotes(text(at)));
        Access::impl(parsed_.objects).push_back(word(at));
        return {};
    }

    HStatus checkNumbers() const {
        if (parsed_.isQuery)
            return {};
        const std::size_t given = parsed_.args.length();
        if (given < syntax_.args.size())
            return failure("argument " + std::to_string(given + 1) + " (" + argTypeName(syntax_.args[given]) +
                           ") is missing");
        if (syntax_.objects != HSyntax::kNone && parsed_.objects.length() < syntax_.minimumObjects)
            return failure("too few arguments: " + std::to_string(given + parsed_.objects.length()) + " of at least " +
                           std::to_string(given + syntax_.minimumObjects));
        return {};
    }

    const HArgList& words_;
    ParsedArgs& parsed_;
    const Syntax& syntax_;
    std::size_t next_ = 0;
};

} // namespace

HStatus parseArgs(const HArgList& words, ParsedArgs& parsed) {
    return Parser(words, parsed).parse();
}

std::shared_ptr<const ParsedArgs> parseArgs(const HSyntax& syntax, const HArgList& words, HStatus& status) {
    auto parsed = std::make_shared<ParsedArgs>();
    parsed->syntax = *Access::impl(syntax);
    status = parseArgs(words, *parsed);
    return status.error() ? nullptr : parsed;
}

} // namespace OpenQuarn
