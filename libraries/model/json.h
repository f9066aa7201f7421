// SPDX-License-Identifier: Apache-2.0
// JSON files of a model directory: opening, parsing and typed member lookup.
#pragma once

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <new>
#include <streambuf>
#include <string>

#include <rapidjson/document.h>

namespace neuralWarp::json {

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
        if (block == nullptr) {
            throw std::bad_alloc();
        }
        return block;
    }
};

using Pool = rapidjson::MemoryPoolAllocator<ThrowingAllocator>;
using Document = rapidjson::GenericDocument<rapidjson::UTF8<>, Pool, ThrowingAllocator>;
using Value = Document::ValueType;

/// Opens a regular file of at most `limit` bytes. On failure prints "Failed to open metadata file stream\n", or what
/// refuse() does for a file that is too large, and returns false.
bool open(std::filebuf& file, const std::filesystem::path& path, std::uint64_t limit);

/// Parses the rest of `source` as one JSON document, nested to any depth: an object, and nothing but white space after
/// it, not even behind a zero byte. On failure prints "Parse error\n", or what refuse() does for another root, and
/// returns false. `path` is what the source is called. Throws std::bad_alloc.
bool parseObject(Document& document, std::streambuf& source, const std::filesystem::path& path);

/// Prints "Error: PATH: REASON\n" on standard output, and returns false.
bool refuse(const std::filesystem::path& path, const char* reason) noexcept;
bool refuse(const std::filesystem::path& path, const std::string& reason) noexcept;

/// refuse() with the reason of the exception in flight. Call it from a catch block only.
bool refuseByException(const std::filesystem::path& path) noexcept;

/// First member named `key`, or null. `object` must be an object.
const Value* find(const Value& object, const char* key);

/// Member `key` when it is an unsigned 32-bit integer, else `fallback`.
std::uint32_t readUint(const Value& object, const char* key, std::uint32_t fallback);

/// Member `key` when it is a string, else the empty string.
std::string readText(const Value& object, const char* key);

} // namespace neuralWarp::json
