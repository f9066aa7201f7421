// SPDX-License-Identifier: Apache-2.0
// JSON files of a model directory: opening, parsing and typed member lookup.
#pragma once

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <streambuf>
#include <string>

#include "storage/Json.h"

namespace neuralWarp::json {

using Document = storage::JsonDocument;
using Value = storage::JsonValue;

/// Opens a regular file of at most `rules.mostBytes` bytes. On failure prints "Failed to open metadata file stream\n",
/// or what refuse() does for a file that is too large, and returns false.
bool open(std::filebuf& file, const std::filesystem::path& path, const storage::JsonRules& rules);

/// Parses the rest of `source` as one JSON object. On failure prints "Parse error\n", or what refuse() does for another
/// root, and returns false. `path` is what the source is called. Throws std::bad_alloc.
bool parseObject(Document& document, std::streambuf& source, const std::filesystem::path& path,
                 const storage::JsonRules& rules);

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
