// SPDX-License-Identifier: Apache-2.0
// JSON: one parser for every text that is read, by rules that each kind of text has.
#pragma once

#include <rapidjson/document.h>

#include <cstdint>
#include <cstdlib>
#include <new>
#include <stdexcept>
#include <streambuf>
#include <string>
#include <string_view>

namespace storage {

/// In what the kinds of texts differ. All of them are one value of RFC 8259 with nothing but white space around it, not
/// even behind a zero byte.
struct JsonRules {
    std::uint64_t mostBytes; ///< of a file, for whoever reads it
    int mostLevels;          ///< of nesting, for those who go through the document by recursion; 0 for any number
    bool isExact;            ///< numbers are the nearest doubles; else faster, and wrong in the last places at times
    bool isUtf8;             ///< texts that are no UTF-8 are refused; else they are any bytes
    bool mayBeMarked;        ///< a byte order mark of UTF-8 may come first
};

namespace jsonRules {
// clang-format off
//                                           bytes                      levels  exact  UTF-8  mark
inline constexpr JsonRules scene           = {std::uint64_t{1} << 32U,  200,    true,  false, true};
inline constexpr JsonRules character       = {UINT32_MAX,               200,    true,  true,  true}; // glTF
inline constexpr JsonRules keys            = {std::uint64_t{1} << 30U,  0,      true,  true,  true}; // of poses
inline constexpr JsonRules joints          = {std::uint64_t{64} << 20U, 0,      false, false, true}; // parents, limits
inline constexpr JsonRules dataset         = {std::uint64_t{64} << 20U, 0,      false, true,  true};
inline constexpr JsonRules modelMetadata   = {std::uint64_t{64} << 20U, 0,      false, false, false};
inline constexpr JsonRules principalShapes = {std::uint64_t{1} << 30U,  0,      false, false, false};
inline constexpr JsonRules networkOptions  = {512,                      8,      true,  true,  false};
inline constexpr JsonRules recipe          = {std::uint64_t{16} << 20U, 0,      true,  true,  true};
inline constexpr JsonRules ledger          = {std::uint64_t{64} << 20U, 0,      true,  false, false}; // our own
inline constexpr JsonRules trace           = {UINT64_MAX,               0,      false, false, false}; // our own
// clang-format on
} // namespace jsonRules

/// RapidJSON writes through whatever its allocator returns; this one throws instead of returning null.
class ThrowingAllocator {
public:
    static const bool kNeedFree = true; // the name and the type are RapidJSON's allocator concept

    void* Malloc(std::size_t size) { return size == 0 ? nullptr : checked(std::malloc(size)); }
    void* Realloc(void* block, std::size_t, std::size_t newSize) {
        if (newSize == 0) {
            std::free(block);
            return nullptr;
        }
        return checked(std::realloc(block, newSize));
    }
    static void Free(void* block) { std::free(block); }

private:
    static void* checked(void* block) {
        if (block == nullptr)
            throw std::bad_alloc();
        return block;
    }
};

using JsonDocument =
    rapidjson::GenericDocument<rapidjson::UTF8<>, rapidjson::MemoryPoolAllocator<ThrowingAllocator>, ThrowingAllocator>;
using JsonValue = JsonDocument::ValueType;

/// A text of a document: its bytes, whatever they are, for as long as the document lives.
inline std::string_view viewOf(const JsonValue& text) {
    return {text.GetString(), text.GetStringLength()};
}

/// What is wrong with a text: "line 3, column 7: Missing a comma ...", both from 1, columns in bytes.
class JsonError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
    JsonError(const JsonError&) = default;
    JsonError& operator=(const JsonError&) = default;
    ~JsonError() override;
};

/// Reads a whole text. Throws JsonError, and std::bad_alloc. Thread: any.
JsonDocument parseJson(std::string_view text, const JsonRules& rules);

/// The same of the file `path`. Throws what readWholeFile() throws, and JsonError with the path before it. Thread: any.
JsonDocument readJson(const std::string& path, const JsonRules& rules);

/// Reads the rest of a source without having its bytes in memory, by rules that ask for speed only: all of them false,
/// levels 0. False when it is no JSON: `document` is of no use then. Throws std::bad_alloc. Thread: any, one at a time.
bool parseJson(JsonDocument& document, std::streambuf& source, const JsonRules& rules);

/// Is told of each value as it comes by: of texts that are too large for a document.
class JsonEvents {
public:
    virtual ~JsonEvents() = default;
    virtual void beginObject() = 0;
    virtual void endObject() = 0;
    virtual void key(std::string_view name) = 0;
    virtual void text(std::string_view value) = 0;
    virtual void number(double value) = 0;
};

/// The same, told to `events` as far as it is JSON.
bool parseJson(JsonEvents& events, std::streambuf& source, const JsonRules& rules);

} // namespace storage
