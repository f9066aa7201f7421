// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <rapidjson/document.h>

#include <filesystem>
#include <optional>

namespace quarn {

/// A JSON file; none when it is not there, is no regular file, larger than 64 MiB, or no JSON. Thread: any.
std::optional<rapidjson::Document> readJson(const std::filesystem::path& path);

} // namespace quarn
