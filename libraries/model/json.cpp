// SPDX-License-Identifier: Apache-2.0
#include "json.h"

#include <cstdio>
#include <exception>
#include <ios>

namespace neuralWarp::json {
namespace {

/// RapidJSON input stream over a stream buffer. Its own wrapper goes through std::istream, whose per-character calls
/// are several times slower; the end of the input reads as a zero byte here as there.
class StreambufInput {
public:
    using Ch = char;

    explicit StreambufInput(std::streambuf& source)
        : source_(source) {}

    Ch Peek() const { return toChar(source_.sgetc()); }
    Ch Take() {
        ++count_;
        return toChar(source_.sbumpc());
    }
    std::size_t Tell() const { return count_; }

    static bool isEnd(std::streambuf& source) { return Traits::eq_int_type(source.sgetc(), Traits::eof()); }

    // Part of RapidJSON's stream concept; only parsing in place would call them.
    Ch* PutBegin() { return nullptr; }
    void Put(Ch) {}
    void Flush() {}
    std::size_t PutEnd(Ch*) { return 0; }

private:
    using Traits = std::streambuf::traits_type;

    static Ch toChar(Traits::int_type c) {
        return Traits::eq_int_type(c, Traits::eof()) ? '\0' : Traits::to_char_type(c);
    }

    std::streambuf& source_;
    std::size_t count_ = 0;
};

} // namespace

bool open(std::filebuf& file, const std::filesystem::path& path, std::uint64_t limit) {
    std::error_code error;
    // A pipe would wait for a writer, and a directory opens on Linux but cannot be read.
    if (!std::filesystem::is_regular_file(path, error) || !file.open(path, std::ios::in)) {
        std::fputs("Failed to open metadata file stream\n", stdout);
        return false;
    }
    const std::uintmax_t size = std::filesystem::file_size(path, error);
    if (!error && size > limit) {
        return refuse(path, "the file is larger than " + std::to_string(limit) + " bytes");
    }
    return true;
}

bool parseObject(Document& document, std::streambuf& source, const std::filesystem::path& path) {
    StreambufInput input(source);
    // Iterative: recursion would let a file of brackets overflow the stack of the evaluation thread (decision 0024).
    document.ParseStream<rapidjson::kParseDefaultFlags | rapidjson::kParseIterativeFlag>(input);
    // the parser takes a zero byte for the end
    if (document.HasParseError() || !StreambufInput::isEnd(source)) {
        std::fputs("Parse error\n", stdout);
        return false;
    }
    return document.IsObject() || refuse(path, "it holds no JSON object");
}

bool refuse(const std::filesystem::path& path, const char* reason) noexcept {
    std::printf("Error: %s: %s\n", path.c_str(), reason);
    return false;
}

bool refuse(const std::filesystem::path& path, const std::string& reason) noexcept {
    return refuse(path, reason.c_str());
}

bool refuseByException(const std::filesystem::path& path) noexcept {
    try {
        throw;
    } catch (const std::bad_alloc&) {
        return refuse(path, "out of memory");
    } catch (const std::exception& error) {
        return refuse(path, error.what());
    } catch (...) {
        return refuse(path, "unknown error");
    }
}

const Value* find(const Value& object, const char* key) {
    const auto member = object.FindMember(key);
    return member == object.MemberEnd() ? nullptr : &member->value;
}

std::uint32_t readUint(const Value& object, const char* key, std::uint32_t fallback) {
    const Value* value = find(object, key);
    return value != nullptr && value->IsUint() ? value->GetUint() : fallback;
}

std::string readText(const Value& object, const char* key) {
    const Value* value = find(object, key);
    return value != nullptr && value->IsString() ? std::string(value->GetString(), value->GetStringLength())
                                                 : std::string();
}

} // namespace neuralWarp::json
