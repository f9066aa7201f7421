// SPDX-License-Identifier: Apache-2.0
// Names with a colon, values with commas between them, braces around what a value has in it, and comments from a
// semicolon to the end of a line:
//     Objects: { Geometry: 140, "Geometry::arm", "Mesh" { Vertices: *24 { a: 0,0,1.5 } } }
#include "quarn/character/fbxArrays.h"

#include <array>
#include <charconv>
#include <stdexcept>
#include <string>

namespace quarn {
namespace {

/// The words of the text: braces, and what stands between spaces and commas; a name has its colon at its end.
class FbxWords {
public:
    explicit FbxWords(std::string_view text)
        : text_(text) {}

    /// Empty at the end of the text.
    std::string_view next() {
        for (;;) {
            const std::size_t begin = text_.find_first_not_of(" \t\r\n,");
            text_.remove_prefix(std::min(begin, text_.size()));
            if (text_.empty() || text_[0] != ';')
                break;
            text_.remove_prefix(std::min(text_.find('\n'), text_.size()));
        }
        return text_.empty() ? text_ : take(lengthOfWord());
    }

private:
    std::size_t lengthOfWord() const {
        if (text_[0] == '{' || text_[0] == '}')
            return 1;
        if (text_[0] == '"') {
            const std::size_t end = text_.find('"', 1);
            if (end == std::string_view::npos)
                throw std::runtime_error("a text in it does not end");
            return end + 1;
        }
        const std::size_t end = text_.find_first_of(" \t\r\n,{}\";:");
        return end == std::string_view::npos ? text_.size() : end + (text_[end] == ':' ? 1 : 0);
    }
    std::string_view take(std::size_t length) {
        const std::string_view word = text_.substr(0, length);
        text_.remove_prefix(length);
        return word;
    }

    std::string_view text_;
};

template <class Number>
Number numberOf(std::string_view word) {
    Number number{};
    const char* end = word.data() + word.size();
    if (const auto read = std::from_chars(word.data(), end, number); read.ec != std::errc() || read.ptr != end)
        throw std::runtime_error("\"" + std::string(word.substr(0, 40)) + "\" stands where a number should");
    return number;
}

class FbxTextReader {
public:
    std::vector<FbxArrays> read(std::string_view text) {
        FbxWords words(text);
        for (std::string_view word = words.next(); !word.empty(); word = words.next())
            take(word);
        if (depth_ > 0)
            throw std::runtime_error("it ends within braces");
        return std::move(geometries_);
    }

private:
    void take(std::string_view word) {
        if (word == "{") {
            if (depth_ == 1 && isIn({"Objects:", "Geometry:"}))
                geometries_.emplace_back();
            ++depth_;
        } else if (word == "}") {
            if (depth_-- == 0)
                throw std::runtime_error("a brace closes what none has opened");
        } else if (word.back() == ':') {
            if (depth_ < names_.size())
                names_[depth_] = word;
        } else if (depth_ == 3 && isIn({"Objects:", "Geometry:"}) && names_[3] == "a:") {
            if (names_[2] == "Vertices:")
                geometries_.back().vertices.push_back(numberOf<double>(word));
            else if (names_[2] == "PolygonVertexIndex:")
                geometries_.back().polygonVertexIndex.push_back(numberOf<std::int32_t>(word));
        }
    }
    bool isIn(std::array<std::string_view, 2> names) const { return names_[0] == names[0] && names_[1] == names[1]; }

    std::vector<FbxArrays> geometries_;
    std::array<std::string_view, 4> names_; ///< of the values that are open, from the outermost in
    std::size_t depth_ = 0;
};

} // namespace

std::vector<FbxArrays> readFbxText(std::string_view bytes) {
    return FbxTextReader().read(bytes);
}

} // namespace quarn
