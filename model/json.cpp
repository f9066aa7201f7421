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
        std::printf("Error: file is larger than %llu bytes\n", static_cast<unsigned long long>(limit));
        return false;
    }
    return true;
}

bool parse(Document& document, std::streambuf& source) {
    StreambufInput input(source);
    // Iterative: recursion would let a file of brackets overflow the stack of the evaluation thread.
    document.ParseStream<rapidjson::kParseDefaultFlags | rapidjson::kParseIterativeFlag>(input);
    if (document.HasParseError()) {
        std::fputs("Parse error\n", stdout);
        return false;
    }
    return true;
}

void printCurrentException() noexcept {
    try {
        throw;
    } catch (const std::bad_alloc&) {
        std::fputs("Error: out of memory\n", stdout);
    } catch (const std::exception& error) {
        std::printf("Error: %s\n", error.what());
    } catch (...) {
        std::fputs("Error: unknown\n", stdout);
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
