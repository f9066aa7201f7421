// SPDX-License-Identifier: Apache-2.0
// An arm of a grid, two joints and blend shapes, with a model: a scene file to make pages of, and the pages read back.
#pragma once

#include "plugin/deformer/support/modelFolder.h"
#include "storage/Json.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"
#include "viewer/Character.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <string>
#include <vector>

/// A page as a browser has it.
struct Page {
    explicit Page(const std::filesystem::path& file);
    viewer::Character character() const { return viewer::Character(blocks); }

    std::string text;
    storage::JsonDocument manifest;
    viewer::Blocks blocks;
};

class ViewScene : public ::testing::Test {
protected:
    static constexpr std::size_t vertexCount = 45;
    static constexpr std::size_t controlCount = 12;
    static constexpr int lastFrame = 7;

    ViewScene();

    /// Writes scene.json and models/arm.nwrp; `more` is run at the end of the scene's script.
    void save(const std::string& more = "", const ModelSpec& model = spec(3, 1)) const;
    /// A model of `shapes` principal shapes, or of deltas where there are none.
    static ModelSpec spec(std::size_t shapes = 3, std::uint32_t deltaMode = 1);

    /// Runs `quarn view scene.json -o page.html` with further words; gives its answer.
    std::string view(const std::vector<std::string>& words = {}) const;
    /// The sentence that it ends with.
    std::string failure(const std::vector<std::string>& words = {}) const {
        return failureOf([&] { view(words); });
    }
    Page page() const { return Page(file()); }
    std::filesystem::path file() const { return folder.path() / "page.html"; }
    std::filesystem::path scene() const { return folder.path() / "scene.json"; }

    TemporaryFolder folder;
};
