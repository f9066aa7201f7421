// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/PageFile.h"

#include "quarn/scene/SceneSession.h"
#include "storage/WholeFile.h"
#include "storage/encodings.h"
#include "storage/readWholeFile.h"

#include <cstdlib>
#include <ostream>
#include <stdexcept>
#include <vector>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr const char* variable = "NEURALWARP_VIEWER";
constexpr const char* place = "<!-- neuralWarp: scene -->";
constexpr std::uint64_t mostBytes = 64'000'000;

std::vector<fs::path> placesOfTemplate() {
    if (const char* given = std::getenv(variable); given != nullptr && *given != '\0')
        return {absolutePath(given)};
    const fs::path folder = fs::read_symlink("/proc/self/exe").parent_path();
    return {folder.parent_path() / "clients" / "viewer" / "viewer.html",
            folder.parent_path() / "share" / "neuralWarp" / "viewer.html"};
}

fs::path findTemplate() {
    std::string looked;
    for (const fs::path& path : placesOfTemplate()) {
        if (fs::exists(path))
            return path;
        looked += (looked.empty() ? "" : ", ") + path.lexically_normal().string();
    }
    throw std::runtime_error("the page of the viewer, viewer.html, was not found; looked at: " + looked +
                             ". A build without clang's WebAssembly target or the pinned npm packages leaves it out; "
                             "set " +
                             variable + " to its path where it lies elsewhere");
}

void writeBlock(std::ostream& out, const PageBlock& block) {
    const auto* letters = reinterpret_cast<const char*>(block.bytes.data()); // as base64() takes bytes
    out << "<script type=\"text/plain\" id=\"block-" << block.name << "\">"
        << storage::base64({letters, block.bytes.size()}) << "</script>\n";
}

} // namespace

PageTemplate::PageTemplate() {
    const fs::path path = findTemplate();
    const std::string page = storage::readWholeFile(path, mostBytes);
    const std::size_t at = page.find(place);
    if (at == std::string::npos || page.find(place, at + 1) != std::string::npos)
        throw std::runtime_error(path.string() + " is no page of the viewer: the line \"" + place +
                                 "\" has to be in it once");
    before_ = page.substr(0, at);
    after_ = page.substr(at + std::string(place).size());
}

void PageTemplate::write(const fs::path& path, const std::string& manifest, const PageBlocks& blocks) const {
    storage::WholeFile file(path);
    file.stream() << before_ << "<script type=\"application/json\" id=\"manifest\">" << manifest << "</script>\n";
    for (const PageBlock& block : blocks.all())
        writeBlock(file.stream(), block);
    file.stream() << after_;
    file.finish();
}

std::uint64_t bytesInFile(const PageBlock& block) {
    return (block.bytes.size() + 2) / 3 * 4;
}

} // namespace quarn
