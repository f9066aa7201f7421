// SPDX-License-Identifier: Apache-2.0
// What the model tests share.
#pragma once

#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>

#include "support/StdoutCapture.h"
#include "support/TemporaryFolder.h"

/// A temporary folder that files are written into.
class TestFolder : public TemporaryFolder {
public:
    std::filesystem::path operator/(const std::filesystem::path& name) const { return path() / name; }

    /// Writes a file in the folder and returns its path.
    std::filesystem::path write(const std::filesystem::path& name, std::string_view bytes) const {
        std::ofstream(path() / name, std::ios::binary) << bytes;
        return path() / name;
    }
};

/// A network file of tests/models, by its name without extension.
inline std::filesystem::path testModel(const std::string& name) {
    return std::filesystem::path(NW_TEST_MODELS) / (name + ".onnx");
}
