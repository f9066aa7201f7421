// SPDX-License-Identifier: Apache-2.0
#include "storage/Json.h"

#include "storage/readWholeFile.h"

#include <rapidjson/error/en.h>
#include <rapidjson/memorystream.h>
#include <rapidjson/reader.h>

#include <algorithm>
#include <cassert>

namespace storage {
namespace {

/// RapidJSON input stream over a stream buffer. Its own wrapper goes through std::istream, whose per-character calls
/// are several times slower; the end of the input reads as a zero byte here as there. Inlined by force: two parsers use
/// it, and a call for each character costs 5 % of the time of principal shapes.
class StreambufInput {
public:
    using Ch = char;

    explicit StreambufInput(std::streambuf& source)
        : source_(source) {}

    [[gnu::always_inline]] Ch Peek() const { return toChar(source_.sgetc()); }
    [[gnu::always_inline]] Ch Take() {
        ++count_;
        return toChar(source_.sbumpc());
    }
    std::size_t Tell() const { return count_; }

    // Part of RapidJSON's stream concept; only parsing in place would call them.
    Ch* PutBegin() { return nullptr; }
    void Put(Ch) {}
    void Flush() {}
    std::size_t PutEnd(Ch*) { return 0; }

private:
    using Traits = std::streambuf::traits_type;

    [[gnu::always_inline]] static Ch toChar(Traits::int_type c) {
        return Traits::eq_int_type(c, Traits::eof()) ? '\0' : Traits::to_char_type(c);
    }

    std::streambuf& source_;
    std::size_t count_ = 0;
};

bool isAtEnd(std::streambuf& source) {
    return source.sgetc() == std::streambuf::traits_type::eof();
}

template <unsigned flags, class Input, class Handler>
rapidjson::ParseResult parseBy(Input& input, Handler& handler) {
    rapidjson::GenericReader<rapidjson::UTF8<>, rapidjson::UTF8<>, ThrowingAllocator> reader;
    // iterative: recursion would let a file of brackets overflow the stack of the thread (decision 0024)
    return reader.template Parse<flags | rapidjson::kParseIterativeFlag>(input, handler);
}

template <unsigned flags, class Input>
rapidjson::ParseResult fill(JsonDocument& document, Input& input) {
    rapidjson::ParseResult result;
    const auto generate = [&](JsonDocument& handler) { return !(result = parseBy<flags>(input, handler)).IsError(); };
    document.Populate(generate);
    return result;
}

rapidjson::ParseResult fill(JsonDocument& document, rapidjson::MemoryStream& input, const JsonRules& rules) {
    constexpr unsigned exact = rapidjson::kParseFullPrecisionFlag;
    constexpr unsigned utf8 = rapidjson::kParseValidateEncodingFlag;
    if (rules.isExact)
        return rules.isUtf8 ? fill<exact | utf8>(document, input) : fill<exact>(document, input);
    return rules.isUtf8 ? fill<utf8>(document, input) : fill<0>(document, input);
}

void requirePlain([[maybe_unused]] const JsonRules& rules) {
    assert(!rules.isExact && !rules.isUtf8 && !rules.mayBeMarked && rules.mostLevels == 0);
}

/// What events hear of: all else goes by.
class EventHandler : public rapidjson::BaseReaderHandler<rapidjson::UTF8<>, EventHandler> {
public:
    explicit EventHandler(JsonEvents& events)
        : events_(events) {}

    bool Key(const char* text, rapidjson::SizeType length, bool) { return events_.key({text, length}), true; }
    bool String(const char* text, rapidjson::SizeType length, bool) { return events_.text({text, length}), true; }
    bool Double(double value) { return events_.number(value), true; }
    bool Int(int value) { return Double(value); }
    bool Uint(unsigned value) { return Double(value); }
    bool Int64(std::int64_t value) { return Double(static_cast<double>(value)); }
    bool Uint64(std::uint64_t value) { return Double(static_cast<double>(value)); }
    bool StartObject() { return events_.beginObject(), true; }
    bool EndObject(rapidjson::SizeType) { return events_.endObject(), true; }

private:
    JsonEvents& events_;
};

[[noreturn]] void failAt(std::string_view text, std::size_t offset, const std::string& what) {
    const std::string_view before = text.substr(0, offset);
    const auto line = std::count(before.begin(), before.end(), '\n') + 1;
    const std::size_t column = offset - (before.rfind('\n') + 1) + 1; // npos + 1 is 0
    throw JsonError("line " + std::to_string(line) + ", column " + std::to_string(column) + ": " + what);
}

// up to the place where a text stops being JSON, brackets outside of strings are its nesting
void checkDepth(std::string_view text, int mostLevels) {
    bool inString = false;
    int depth = 0;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const char c = text[i];
        if (inString) {
            i += c == '\\' ? 1 : 0;
            inString = c != '"';
        } else if (c == '"') {
            inString = true;
        } else if (c == '[' || c == '{') {
            if (++depth > mostLevels)
                failAt(text, i, "nested more than " + std::to_string(mostLevels) + " levels deep");
        } else if (c == ']' || c == '}') {
            --depth;
        }
    }
}

} // namespace

JsonError::~JsonError() = default;

JsonDocument parseJson(std::string_view text, const JsonRules& rules) {
    constexpr std::string_view byteOrderMark = "\xef\xbb\xbf";
    const std::size_t start = rules.mayBeMarked && text.starts_with(byteOrderMark) ? byteOrderMark.size() : 0;
    if (rules.mostLevels > 0)
        checkDepth(text, rules.mostLevels);
    JsonDocument document;
    rapidjson::MemoryStream input(text.data() + start, text.size() - start);
    const rapidjson::ParseResult result = fill(document, input, rules);
    if (result.IsError())
        failAt(text, start + result.Offset(), rapidjson::GetParseError_En(result.Code()));
    if (start + input.Tell() < text.size()) // a NUL ends the text for the parser
        failAt(text, start + input.Tell(), "a NUL byte");
    return document;
}

JsonDocument readJson(const std::string& path, const JsonRules& rules) {
    const std::string text = readWholeFile(path, rules.mostBytes);
    try {
        return parseJson(text, rules);
    } catch (const JsonError& error) {
        throw JsonError(path + ": " + error.what());
    }
}

bool parseJson(JsonDocument& document, std::streambuf& source, const JsonRules& rules) {
    requirePlain(rules);
    StreambufInput input(source);
    return !fill<0>(document, input).IsError() && isAtEnd(source);
}

bool parseJson(JsonEvents& events, std::streambuf& source, const JsonRules& rules) {
    requirePlain(rules);
    StreambufInput input(source);
    EventHandler handler(events);
    return !parseBy<0>(input, handler).IsError() && isAtEnd(source);
}

} // namespace storage
