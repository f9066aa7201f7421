// SPDX-License-Identifier: Apache-2.0
#include "storage/npyHeader.h"

#include <algorithm>
#include <charconv>
#include <stdexcept>
#include <vector>

namespace storage {
namespace {

constexpr std::string_view magic("\x93NUMPY", 6);

[[noreturn]] void fail(const std::string& why) {
    throw std::runtime_error(why);
}

/// A piece of the file for a message: short, and without anything that a terminal acts on.
std::string quoted(std::string_view piece) {
    constexpr std::size_t longest = 40;
    std::string text(piece.substr(0, longest));
    std::replace_if(
        text.begin(), text.end(), [](char c) { return c < ' ' || c > '~'; }, '?');
    return "'" + text + (piece.size() > longest ? "...'" : "'");
}

/// The little-endian number that the bytes are.
std::size_t numberFrom(std::string_view bytes) {
    std::size_t number = 0;
    unsigned shift = 0;
    for (const char byte : bytes) {
        number |= std::size_t{static_cast<unsigned char>(byte)} << shift;
        shift += 8;
    }
    return number;
}

// --- the dictionary ---

/// Takes the tokens of a header off its front. White space between them means nothing.
class Tokens {
public:
    explicit Tokens(std::string_view text)
        : text_(text)
        , rest_(text) {}

    bool accept(std::string_view token) {
        skipSpace();
        if (!rest_.starts_with(token))
            return false;
        rest_.remove_prefix(token.size());
        return true;
    }
    void expect(std::string_view token) {
        if (!accept(token))
            failAt(std::string(token));
    }
    void expectEnd() {
        skipSpace();
        if (!rest_.empty())
            failAt("nothing more");
    }

    /// A text in quotes of either kind, without escapes.
    std::string_view text() {
        const std::string_view quote = accept("'") ? "'" : accept("\"") ? "\"" : "";
        if (quote.empty())
            failAt("a text in quotes");
        const std::size_t length = rest_.find(quote);
        if (length == std::string_view::npos)
            failAt("a closing quote");
        const std::string_view found = rest_.substr(0, length);
        if (found.find('\\') != std::string_view::npos)
            failAt("a text without '\\'");
        rest_.remove_prefix(length + 1);
        return found;
    }

    bool truth() {
        if (accept("True"))
            return true;
        expect("False");
        return false;
    }

    std::uint64_t number() {
        skipSpace();
        std::uint64_t value = 0;
        const auto [end, error] = std::from_chars(rest_.data(), rest_.data() + rest_.size(), value);
        if (error == std::errc::result_out_of_range)
            fail("its header has a number that is too large at byte " + std::to_string(position()));
        const auto length = static_cast<std::size_t>(end - rest_.data());
        if (error != std::errc() || (length > 1 && rest_.front() == '0'))
            failAt("a number");
        rest_.remove_prefix(length);
        return value;
    }

    /// The error that something else stands here.
    [[noreturn]] void failAt(const std::string& expected) const {
        fail("its header should have " + expected + " at byte " + std::to_string(position()) + ", and has " +
             (rest_.empty() ? "ended" : quoted(rest_)));
    }

private:
    void skipSpace() { rest_.remove_prefix(std::min(rest_.find_first_not_of(" \t\n"), rest_.size())); }
    std::size_t position() const { return text_.size() - rest_.size(); }

    std::string_view text_;
    std::string_view rest_;
};

using Shape = std::vector<std::uint64_t>;

/// A tuple of numbers. That of one number needs its comma, as in Python.
Shape shapeFrom(Tokens& tokens) {
    Shape shape;
    tokens.expect("(");
    while (!tokens.accept(")")) {
        shape.push_back(tokens.number());
        if (!tokens.accept(",")) {
            if (shape.size() == 1)
                tokens.failAt(",");
            tokens.expect(")");
            break;
        }
    }
    return shape;
}

void readDescr(Tokens& tokens, NpyArray& array) {
    if (tokens.accept("["))
        fail("its elements are structures: plain numbers are read, such as '<f4'");
    array.descr = tokens.text();
}

void readOrder(Tokens& tokens) {
    if (tokens.truth())
        fail("it is in Fortran order: arrays in C order are read, as numpy.ascontiguousarray makes it");
}

void readValue(Tokens& tokens, std::string_view key, NpyArray& array) {
    if (key == "descr")
        readDescr(tokens, array);
    else if (key == "fortran_order")
        readOrder(tokens);
    else if (key == "shape")
        array.shape = shapeFrom(tokens);
    else
        fail("its header has an unknown key " + quoted(key));
}

} // namespace

NpyPlace findNpyHeader(std::string_view bytes) {
    if (!bytes.starts_with(magic))
        fail("it is no NumPy file: it does not begin with \"\\x93NUMPY\"");
    if (bytes.size() < npyPreambleSize)
        fail("it is cut short: it ends within its first " + std::to_string(npyPreambleSize) + " bytes");
    const auto major = static_cast<unsigned char>(bytes[6]);
    const auto minor = static_cast<unsigned char>(bytes[7]);
    if (major < 1 || major > 3 || minor != 0)
        fail("it has format version " + std::to_string(major) + "." + std::to_string(minor) +
             ": versions 1.0, 2.0 and 3.0 are read");
    const std::size_t lengthSize = major == 1 ? 2 : 4;
    const NpyPlace place{8 + lengthSize, numberFrom(bytes.substr(8, lengthSize))};
    if (place.length > npyMaxHeaderLength)
        fail("its header is to have " + std::to_string(place.length) + " bytes: at most " +
             std::to_string(npyMaxHeaderLength) + " are read");
    return place;
}

NpyArray parseNpyArray(std::string_view text) {
    constexpr std::string_view keys[] = {"descr", "fortran_order", "shape"};
    NpyArray array;
    std::vector<std::string_view> seen;
    Tokens tokens(text);
    tokens.expect("{");
    while (!tokens.accept("}")) {
        const std::string_view key = tokens.text();
        if (std::find(seen.begin(), seen.end(), key) != seen.end())
            fail("its header has " + quoted(key) + " twice");
        tokens.expect(":");
        readValue(tokens, key, array);
        seen.push_back(key);
        if (!tokens.accept(",")) {
            tokens.expect("}");
            break;
        }
    }
    tokens.expectEnd();
    for (const std::string_view key : keys)
        if (std::find(seen.begin(), seen.end(), key) == seen.end())
            fail("its header has no " + quoted(key));
    return array;
}

NpyHeader parseNpyHeader(std::string_view text) {
    const NpyArray array = parseNpyArray(text);
    if (array.descr != "<f4" && array.descr != "<f8")
        fail("its numbers are " + quoted(array.descr) + ": a point cache has '<f4' or '<f8', little-endian floats");
    const std::vector<std::uint64_t>& shape = array.shape;
    if (shape.size() < 2 || shape.size() > 3 || shape.back() != 3)
        fail("its shape is " + npyShapeText(shape) + ": a point cache has [frames, vertices, 3] or [vertices, 3]");
    NpyHeader header;
    header.scalarSize = array.descr == "<f4" ? 4 : 8;
    header.vertices = shape[shape.size() - 2];
    header.frames = shape.size() == 3 ? shape.front() : 1;
    return header;
}

void requireNpySize(const NpyArray& array, std::size_t numberSize, std::uint64_t size) {
    std::uint64_t needed = numberSize;
    for (const std::uint64_t count : array.shape)
        if (__builtin_mul_overflow(needed, count, &needed))
            fail("its shape " + npyShapeText(array.shape) + " is too large");
    if (needed != size)
        fail("its shape " + npyShapeText(array.shape) + " takes " + std::to_string(needed) + " bytes, and " +
             std::to_string(size) + " follow the header");
}

std::string npyShapeText(const std::vector<std::uint64_t>& shape) {
    std::string text;
    for (std::size_t i = 0; i < std::min<std::size_t>(shape.size(), 5); ++i)
        text += (i > 0 ? ", " : "") + std::to_string(shape[i]);
    return "[" + text + (shape.size() > 5 ? ", ...]" : "]");
}

std::string makeNpyHead(std::string_view descr, const std::vector<std::uint64_t>& shape) {
    constexpr std::size_t textLength = npyHeadSize - 10;
    std::string head(magic);
    head += {'\1', '\0', static_cast<char>(textLength), '\0'};
    head += "{'descr': '" + std::string(descr) + "', 'fortran_order': False, 'shape': (";
    for (std::size_t i = 0; i < shape.size(); ++i)
        head += (i > 0 ? " " : "") + std::to_string(shape[i]) + (i + 1 < shape.size() || i == 0 ? "," : "");
    head += "), }";
    head.resize(npyHeadSize - 1, ' ');
    return head += '\n';
}

std::string makeNpyHead(std::uint64_t frames, std::uint64_t vertices) {
    return makeNpyHead("<f4", {frames, vertices, 3});
}

} // namespace storage
