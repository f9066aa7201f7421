// SPDX-License-Identifier: Apache-2.0
#include "services/SceneFileState.h"

#include "openquarn/HFileIO.h"

#include <atomic>
#include <mutex>
#include <utility>

namespace OpenQuarn {
namespace {

struct SceneFile {
    std::mutex mutex;
    std::string path;
};

SceneFile& sceneFile() {
    static SceneFile theFile;
    return theFile;
}

std::atomic<int> versionBeingRead{-1};

} // namespace

std::string currentSceneFile() {
    const std::scoped_lock lock(sceneFile().mutex);
    return sceneFile().path;
}

void setCurrentSceneFile(std::string path) {
    const std::scoped_lock lock(sceneFile().mutex);
    sceneFile().path = std::move(path);
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
