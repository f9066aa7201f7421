// SPDX-License-Identifier: Apache-2.0
#include "commands/ScriptText.h"

#include <array>
#include <utility>

namespace OpenQuarn {
namespace {

constexpr std::string_view byteOrderMark = "\xEF\xBB\xBF";
constexpr std::array<std::pair<char, char>, 4> escapes{{{'"', '"'}, {'\\', '\\'}, {'n', '\n'}, {'t', '\t'}}};

bool isBlank(char c) {
    return c == ' ' || c == '\t' || c == '\r';
}

bool isControl(char c) {
    const auto code = static_cast<unsigned char>(c);
    return (code < 0x20 && c != '\t' && c != '\n' && c != '\r') || code == 0x7F;
}

class Splitter {
public:
    explicit Splitter(std::string_view text)
        : rest_(text) {
        if (rest_.substr(0, byteOrderMark.size()) == byteOrderMark)
            rest_.remove_prefix(byteOrderMark.size());
    }

    std::vector<ScriptCommand> split() {
        while (!rest_.empty())
            step();
        endCommand();
        return std::move(commands_);
    }

private:
    void step() {
        const char c = rest_.front();
        if (c == '\n' || c == ';') {
            take();
            endCommand();
        } else if (isBlank(c)) {
            take();
        } else if (continuation() > 0) {
            for (std::size_t n = continuation(); n > 0; --n)
                take();
        } else if (c == '#' || rest_.substr(0, 2) == "//") {
            rest_.remove_prefix(std::min(rest_.find('\n'), rest_.size()));
        } else {
            word();
        }
    }

    void word() {
        if (current_.words.empty())
            current_.line = line_;
        ScriptWord word{{}, rest_.front() == '"' || rest_.front() == '\''};
        while (!atEndOfWord())
            piece(word.text);
        current_.words.push_back(std::move(word));
    }

    void piece(std::string& text) {
        const char c = rest_.front();
        if (c == '"')
            doubleQuoted(text);
        else if (c == '\'')
            singleQuoted(text);
        else if (c == '`')
            throw ScriptError(line_, "back-quoted commands are not supported: run the command on a line of its own");
        else
            text += take();
    }

    void doubleQuoted(std::string& text) {
        take();
        while (inQuote("\"")) {
            const char c = take();
            text += c == '\\' ? escaped() : c;
        }
        take();
    }

    void singleQuoted(std::string& text) {
        take();
        while (inQuote("'"))
            text += take();
        take();
    }

    // the closing quote is left to be taken; a line that ends before it is an error
    bool inQuote(const char* quote) const {
        if (rest_.empty() || rest_.front() == '\n')
            throw ScriptError(line_, std::string("the quote ") + quote + " is not closed at the end of the line");
        return rest_.front() != *quote;
    }

    char escaped() {
        const char c = rest_.empty() ? '\n' : rest_.front();
        for (const auto& [written, meant] : escapes)
            if (c == written) {
                take();
                return meant;
            }
        if (c == '\n' || c == '\r')
            throw ScriptError(line_, "the quote \" is not closed at the end of the line");
        throw ScriptError(line_, std::string("unknown escape \\") + c + R"( in "...": \" \\ \n and \t are known)");
    }

    bool atEndOfWord() const {
        return rest_.empty() || isBlank(rest_.front()) || rest_.front() == '\n' || rest_.front() == ';' ||
               continuation() > 0;
    }

    // length of a "\" with the end of the line after it; 0 for none
    std::size_t continuation() const {
        if (rest_.substr(0, 2) == "\\\n")
            return 2;
        return rest_.substr(0, 3) == "\\\r\n" ? 3 : 0;
    }

    char take() {
        const char c = rest_.front();
        if (isControl(c))
            throw ScriptError(line_, "a control character, code " + std::to_string(static_cast<unsigned char>(c)));
        rest_.remove_prefix(1);
        line_ += c == '\n' ? 1 : 0;
        return c;
    }

    void endCommand() {
        if (!current_.words.empty())
            commands_.push_back(std::exchange(current_, {}));
    }

    std::string_view rest_;
    int line_ = 1;
    ScriptCommand current_;
    std::vector<ScriptCommand> commands_;
};

bool isPlain(std::string_view text) {
    return !text.empty() && text.front() != '#' && text.substr(0, 2) != "//" && text.front() != '-' &&
           text.substr(0, byteOrderMark.size()) != byteOrderMark &&
           text.find_first_of(" \t\r\n;\"'`\\") == std::string_view::npos;
}

} // namespace

std::vector<ScriptCommand> splitScript(std::string_view text) {
    return Splitter(text).split();
}

std::string quoteScriptWord(std::string_view text) {
    if (isPlain(text))
        return std::string(text);
    std::string quoted = "\"";
    for (const char c : text) {
        const bool escape = c == '"' || c == '\\' || c == '\n' || c == '\t';
        if (escape)
            quoted += '\\';
        quoted += c == '\n' ? 'n' : c == '\t' ? 't' : c;
    }
    return quoted + '"';
}

} // namespace OpenQuarn
