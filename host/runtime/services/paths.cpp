// SPDX-License-Identifier: Apache-2.0
#include "services/paths.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <system_error>

namespace OpenQuarn {
namespace {

/// A variable as it stands at the start of a text.
struct Reference {
    std::string name;
    std::size_t length; // in the text, with its marks; 0 when there is none
};

Reference bracedReference(std::string_view text) {
    const std::size_t end = text.find('}');
    if (end == std::string_view::npos)
        return {{}, 0};
    return {std::string(text.substr(2, end - 2)), end + 1};
}

Reference plainReference(std::string_view text) {
    const auto end = std::find_if_not(text.begin() + 1, text.end(), isNameCharacter);
    const auto length = static_cast<std::size_t>(end - text.begin());
    return {std::string(text.substr(1, length - 1)), length};
}

const char* valueOf(const std::string& name) {
    return name.empty() ? nullptr : std::getenv(name.c_str());
}

std::string expandVariables(std::string_view text) {
    std::string expanded;
    while (!text.empty()) {
        const std::size_t plain = std::min(text.find('$'), text.size());
        expanded += text.substr(0, plain);
        text.remove_prefix(plain);
        if (text.empty())
            break;
        const Reference reference = text.substr(0, 2) == "${" ? bracedReference(text) : plainReference(text);
        const char* value = valueOf(reference.name);
        const std::size_t used = value ? reference.length : 1;
        expanded += value ? std::string_view(value) : text.substr(0, used);
        text.remove_prefix(used);
    }
    return expanded;
}

} // namespace

std::string expandPath(std::string_view path) {
    const bool startsAtHome = path == "~" || path.substr(0, 2) == "~/";
    const char* home = startsAtHome ? valueOf("HOME") : nullptr;
    return home ? home + expandVariables(path.substr(1)) : expandVariables(path);
}

std::string joinPath(std::string_view head, std::string_view tail) {
    std::string joined(head);
    if (!joined.empty() && joined.back() != '/')
        joined += '/';
    return joined.append(tail);
}

bool isNameCharacter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '_';
}

bool isAbsolutePath(std::string_view path) {
    return !path.empty() && path.front() == '/';
}

bool pathExists(const std::string& path) {
    std::error_code unanswered;
    return !path.empty() && std::filesystem::exists(path, unanswered);
}

} // namespace OpenQuarn
