// SPDX-License-Identifier: Apache-2.0
#include "files/Rebasing.h"

#include "openquarn_app/Workspace.h"
#include "services/SceneFileState.h"
#include "services/paths.h"

#include <algorithm>
#include <stdexcept>

namespace OpenQuarn {
namespace {

namespace fs = std::filesystem;

/// True for a relative path that leads to something from `folder`; a pattern leads to the folder that its files are in.
bool leadsSomewhere(const ExternalContent& content, const fs::path& folder) {
    const fs::path path = content.unresolved;
    if (path.empty() || path.is_absolute())
        return false;
    const fs::path file = folder / path;
    return pathExists(content.role == filePatternRole ? file.parent_path().string() : file.string());
}

bool mayHoldVariable(std::string_view path) {
    for (std::size_t at = path.find('$'); at != std::string_view::npos; at = path.find('$', at + 1))
        if (at + 1 < path.size() && (path[at + 1] == '{' || isNameCharacter(path[at + 1])))
            return true;
    return false;
}

void warnOfKept(const std::vector<Relocation>& wanted, Warnings& warnings) {
    const std::vector<ExternalContent> now = externalContent();
    for (const Relocation& row : wanted) {
        const auto found = std::find_if(now.begin(), now.end(), [&](const ExternalContent& content) {
            return content.node == row.node && content.key == row.key;
        });
        if (found != now.end() && found->unresolved != row.location)
            warnings.add(row.node + "." + row.key + " is locked or connected and still names '" + found->unresolved +
                         "', which is '" + row.location + "' for the scene's new folder");
    }
}

} // namespace

std::string pathForScene(const fs::path& file, const fs::path& folder) {
    const fs::path whole = file.lexically_normal();
    const fs::path relative = whole.lexically_relative(folder.lexically_normal());
    const bool outside = relative.empty() || *relative.begin() == "..";
    std::string text = (outside ? whole : relative).generic_string();
    if (mayHoldVariable(text))
        throw std::runtime_error(text + " cannot be named in a scene, where $ begins a variable of the environment: "
                                        "give the file or its folder another name");
    return text.front() == '~' ? "./" + text : text; // which would be the home directory
}

Rebasing::Rebasing(const fs::path& folder, Warnings& warnings)
    : folderBefore_(currentSceneFolder()) {
    if (folder == folderBefore_)
        return;
    const fs::path from = folderBefore_.empty() ? Workspace::callersFolder() : folderBefore_;
    std::vector<Relocation> wanted;
    for (const ExternalContent& content : externalContent()) {
        if (folder == from || !leadsSomewhere(content, from))
            continue;
        try {
            wanted.push_back({content.node, content.key, pathForScene(from / content.unresolved, folder)});
            before_.push_back({content.node, content.key, content.unresolved});
        } catch (const std::runtime_error& error) {
            warnings.add(content.node + "." + content.key + " still names '" + content.unresolved +
                         "': " + error.what());
        }
    }
    setCurrentSceneFolder(folder.string());
    if (!wanted.empty()) {
        relocate(wanted);
        warnOfKept(wanted, warnings);
    }
}

void Rebasing::undo() {
    if (!before_.empty())
        relocate(before_);
    setCurrentSceneFolder(folderBefore_.string());
}

} // namespace OpenQuarn
