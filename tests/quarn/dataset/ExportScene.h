// SPDX-License-Identifier: Apache-2.0
// A strip of quads that a joint turns as a whole, with a target that goes with it: a scene file to export from.
#pragma once

#include "quarn/dataset/exportDatasets.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"
#include "support/rawCache.h"

#include <gmock/gmock.h>

#include <map>
#include <string>
#include <vector>

class ExportScene : public ::testing::Test {
protected:
    static constexpr unsigned vertexCount = 12;
    static constexpr double turn = 0.05; ///< of the joint about z, in each frame after the first

    ExportScene();

    /// Writes strip.npy, the target. `change` is given each frame's points.
    template <class Change>
    void writeTarget(std::size_t frames, Change change) {
        std::vector<std::vector<float>> cache;
        for (std::size_t frame = 0; frame < frames; ++frame) {
            cache.push_back(targetAt(frame));
            change(frame, cache.back());
        }
        writeCache(cache);
    }
    void writeTarget(std::size_t frames) {
        writeTarget(frames, [](std::size_t, std::vector<float>&) {});
    }
    void writeCache(const std::vector<std::vector<float>>& frames) const {
        writeRawCache(folder.path() / "strip.npy", frames);
    }
    /// x, y, z of the strip at rest, and of the target in a frame that counts from 0.
    static std::vector<float> restPoints();
    static std::vector<float> targetAt(std::size_t frame);
    /// The points as the joint has them in a frame that counts from 0.
    static std::vector<float> turned(const std::vector<float>& xyz, std::size_t frame);

    /// Builds the scene in the session that is open, or in one of its own to save it; `more` is run at its end.
    static void build(std::size_t frames, const std::string& more = "");
    void save(std::size_t frames, const std::string& more = "") const;

    std::filesystem::path scene() const { return folder.path() / "scene.json"; }
    std::filesystem::path data() const { return folder.path() / "data" / "strip"; }
    quarn::ExportOptions options() const;
    /// The sentence of the error that an export ends with.
    static std::string errorOf(const quarn::ExportOptions& options) {
        return failureOf([&] { quarn::exportDatasets(options); });
    }
    /// The numbers of an array file, after its header.
    template <class Number>
    static std::vector<Number> numbersOf(const std::filesystem::path& file) {
        const std::string bytes = contentOf(file).substr(128);
        const auto* first = reinterpret_cast<const Number*>(bytes.data());
        return {first, first + bytes.size() / sizeof(Number)};
    }
    static std::string contentOf(const std::filesystem::path& file);
    /// Of all files in a folder, by name.
    static std::map<std::string, std::string> contentsOf(const std::filesystem::path& folder);

    TemporaryFolder folder;
};
