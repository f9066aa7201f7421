// SPDX-License-Identifier: Apache-2.0
// The HTML file: the page that was made when quarn was built, with a manifest and blocks put into it.
#pragma once

#include "quarn/view/PageBlocks.h"

#include <cstdint>
#include <filesystem>
#include <string>

namespace quarn {

/// The page without a scene.
class PageTemplate {
public:
    /// Reads $NEURALWARP_VIEWER, or the page where this program was built or installed. Throws std::runtime_error that
    /// names all of these places, when it is at none, and for a file that has no place for a scene. Thread: main.
    PageTemplate();

    std::uint64_t bytes() const { return before_.size() + after_.size(); }
    /// Writes the whole file. Throws storage::FileError. Thread: main.
    void write(const std::filesystem::path& path, const std::string& manifest, const PageBlocks& blocks) const;

private:
    std::string before_, after_; ///< the place of the scene
};

/// The bytes of a block in the file.
std::uint64_t bytesInFile(const PageBlock& block);

} // namespace quarn
