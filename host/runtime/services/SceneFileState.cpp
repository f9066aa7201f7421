// SPDX-License-Identifier: Apache-2.0
#include "services/SceneFileState.h"

#include "openquarn/HFileIO.h"
#include "openquarn_app/SceneFile.h"
#include "openquarn_app/Workspace.h"

#include <atomic>
#include <mutex>
#include <utility>

namespace OpenQuarn {
namespace {

struct SceneFile {
    std::mutex mutex;
    SceneFileNames names;
    SceneFolderSink folderSink;
};

SceneFile& sceneFile() {
    static SceneFile theFile;
    return theFile;
}

std::atomic<int> versionBeingRead{-1};

} // namespace

std::string currentSceneFile() {
    const std::scoped_lock lock(sceneFile().mutex);
    return sceneFile().names.path;
}

std::string folderOfScene(const std::string& file) {
    return std::filesystem::absolute(Workspace::callersPath(file)).lexically_normal().parent_path().string();
}

std::string currentSceneFolder() {
    const std::scoped_lock lock(sceneFile().mutex);
    return sceneFile().names.folder;
}

void setCurrentSceneFile(std::string path) {
    const std::string folder = path.empty() ? std::string() : folderOfScene(path);
    {
        const std::scoped_lock lock(sceneFile().mutex);
        sceneFile().names.path = std::move(path);
    }
    setCurrentSceneFolder(folder);
}

void setCurrentSceneFolder(const std::string& folder) {
    SceneFolderSink sink;
    {
        const std::scoped_lock lock(sceneFile().mutex);
        sceneFile().names.folder = folder;
        sink = sceneFile().folderSink;
    }
    if (sink)
        sink(folder);
}

SceneFileNames exchangeSceneFile(SceneFileNames names) {
    std::string folder;
    SceneFolderSink sink;
    {
        const std::scoped_lock lock(sceneFile().mutex);
        std::swap(sceneFile().names, names);
        if (sceneFile().names.folder != names.folder) {
            folder = sceneFile().names.folder;
            sink = sceneFile().folderSink;
        }
    }
    if (sink)
        sink(folder);
    return names;
}

SceneFolderSink setSceneFolderSink(SceneFolderSink sink) {
    const std::scoped_lock lock(sceneFile().mutex);
    return std::exchange(sceneFile().folderSink, std::move(sink));
}

int readingFileVersion() noexcept {
    return versionBeingRead;
}

ReadingSceneFile::ReadingSceneFile(int version) noexcept
    : previous_(versionBeingRead.exchange(version)) {}

ReadingSceneFile::~ReadingSceneFile() {
    versionBeingRead = previous_;
}

} // namespace OpenQuarn

int HFileIO::currentlyReadingFileVersion() noexcept {
    return OpenQuarn::readingFileVersion();
}

HString HFileIO::currentFile() {
    return HString(OpenQuarn::currentSceneFile());
}
