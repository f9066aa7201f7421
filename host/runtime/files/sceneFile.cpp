// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/SceneFile.h"

#include "core/threads.h"
#include "files/Rebasing.h"
#include "files/json.h"
#include "files/sceneText.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Workspace.h"
#include "services/SceneFileState.h"
#include "storage/FileError.h"
#include "storage/WholeFile.h"
#include "storage/readWholeFile.h"
#include "types/baseNodes.h"

#include <stdexcept>

namespace OpenQuarn {
namespace {

std::string readText(const std::filesystem::path& path) {
    return storage::readWholeFile(Workspace::callersPath(path), storage::jsonRules::scene.mostBytes);
}

/// Runs `work(warnings)`, and makes of what it finds and throws the outcome, with the file's name before every text.
template <class Work>
FileOutcome fileOperation(const std::string& fileName, Work&& work) {
    FileOutcome outcome;
    Warnings warnings;
    try {
        work(warnings);
        outcome.ok = true;
    } catch (const std::bad_alloc&) {
        outcome.error = fileName + ": there is not enough memory";
    } catch (const storage::FileError& error) {
        outcome.error = fileName + ": " + error.predicate();
    } catch (const std::exception& error) {
        outcome.error = fileName + ": " + error.what();
    }
    for (const auto& [text, severity] : warnings.take()) {
        outcome.warnings.push_back(fileName + ": " + text);
        showMessage(severity, outcome.warnings.back());
    }
    return outcome;
}

/// The same for a function of the main thread.
template <class Work>
FileOutcome sceneOperation(const char* function, const std::string& fileName, Work&& work) {
    return fileOperation(fileName, [&](Warnings& warnings) {
        requireThread({function, ThreadTag::main});
        work(warnings);
    });
}

// What was read only in part must not be saved in the place of the whole.
void readWhole(const storage::JsonDocument& document, Graph& graph, Warnings& warnings) {
    try {
        readScene(document, graph, warnings);
    } catch (...) {
        graph.clear(1.0);
        setCurrentSceneFile({});
        throw;
    }
}

std::string textMember(const storage::JsonValue& object, const char* key) {
    if (!object.IsObject())
        return {};
    const auto member = object.FindMember(key);
    return member != object.MemberEnd() && member->value.IsString() ? std::string(viewOf(member->value)) : "";
}

const storage::JsonValue* listMember(const storage::JsonValue& object, const char* key) {
    const auto member = object.FindMember(key);
    return member != object.MemberEnd() && member->value.IsArray() ? &member->value : nullptr;
}

void summarize(const storage::JsonDocument& document, SceneSummary& summary) {
    summary.version = sceneVersion(document);
    summary.writtenBy = textMember(document, SceneKey::writtenBy);
    if (const auto time = document.FindMember(SceneKey::time); time != document.MemberEnd() && time->value.IsNumber())
        summary.time = time->value.GetDouble();
    if (const storage::JsonValue* nodes = listMember(document, SceneKey::nodes)) {
        summary.nodes = nodes->Size();
        for (const storage::JsonValue& node : nodes->GetArray())
            ++summary.nodesByType[textMember(node, SceneKey::type)];
    }
    if (const storage::JsonValue* connections = listMember(document, SceneKey::connections))
        summary.connections = connections->Size();
    if (const storage::JsonValue* plugins = listMember(document, SceneKey::plugins))
        for (const storage::JsonValue& plugin : plugins->GetArray())
            if (plugin.IsString())
                summary.plugins.emplace_back(viewOf(plugin));
    for (const auto& [type, count] : summary.nodesByType)
        if (!findNodeClass(type))
            summary.missingTypes.push_back(type);
}

} // namespace

FileOutcome openScene(const std::filesystem::path& path) {
    return sceneOperation("openScene", path.string(), [&](Warnings& warnings) {
        Graph& graph = currentGraph();
        const storage::JsonDocument document = parseScene(readText(path));
        setCurrentSceneFile(path.string()); // nodes look for files beside it
        readWhole(document, graph, warnings);
    });
}

FileOutcome saveScene(const std::filesystem::path& path) {
    return sceneOperation("saveScene", path.string(), [&](Warnings& warnings) {
        const std::filesystem::path file = Workspace::callersPath(path);
        Rebasing rebasing(folderOfScene(file.string()), warnings);
        try {
            storage::writeWhole(file, writeScene(currentGraph(), warnings));
        } catch (...) {
            rebasing.undo();
            throw;
        }
        setCurrentSceneFile(path.string());
    });
}

FileOutcome moveScene(const std::filesystem::path& folder) {
    return sceneOperation("moveScene", folder.string(), [&](Warnings& warnings) { Rebasing(folder, warnings); });
}

FileOutcome sceneFromText(const std::string& text, const std::string& fileName) {
    return sceneOperation("sceneFromText", fileName, [&](Warnings& warnings) {
        Graph& graph = currentGraph();
        const storage::JsonDocument document = parseScene(text);
        readWhole(document, graph, warnings);
    });
}

FileOutcome sceneToText(std::string& text) {
    return sceneOperation("sceneToText", "the scene",
                          [&](Warnings& warnings) { text = writeScene(currentGraph(), warnings); });
}

std::string currentFile() {
    return currentSceneFile();
}

SceneSummary readSummary(const std::filesystem::path& path) {
    SceneSummary summary;
    summary.outcome = fileOperation(path.string(), [&](Warnings&) {
        const std::string text = readText(path);
        const storage::JsonDocument document = parseScene(text);
        registerBaseNodes();
        summary.bytes = text.size();
        summarize(document, summary);
    });
    return summary;
}

} // namespace OpenQuarn
