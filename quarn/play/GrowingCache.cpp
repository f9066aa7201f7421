// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/GrowingCache.h"

#include "quarn/console/Console.h"
#include "quarn/scene/goOn.h"
#include "storage/Folder.h"
#include "storage/Target.h"
#include "storage/WholeFile.h"

#include <array>
#include <charconv>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr const char* pointsFile = "points.npy";
constexpr const char* verticesEntry = "vertices";
constexpr std::array ourFiles = {pointsFile, RecordedRows::progressFile, setupFile, storage::FolderLock::fileName};

bool isOurs(const fs::path& path) {
    return belongsToMaking(path.filename().native(), ourFiles);
}

// 0 for what is no number
std::size_t numberFrom(const std::string& text) {
    std::size_t number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc() && end == text.data() + text.size() ? number : 0;
}

} // namespace

GrowingCache::GrowingCache(const fs::path& file, Setup setup, std::size_t frames, bool replaces, const Console& console)
    : console_(console)
    , file_(storage::findTarget(file, false).file)
    , part_(file_.string() + ".part")
    , setup_(std::move(setup))
    , frames_(frames)
    , replaces_(replaces)
    , madeFolders_(storage::makeFolders(file_.parent_path(), file)) {
    try {
        lock_.emplace(part_, "another quarn play or bake");
        requireOursOnly();
    } catch (...) {
        lock_.reset();
        storage::removeFolders(madeFolders_); // there is no destructor after this
        throw;
    }
}

GrowingCache::~GrowingCache() {
    rows_.reset();
    lock_.reset();
    storage::removeFolders(madeFolders_);
}

void GrowingCache::open(std::size_t vertices) {
    vertices_ = vertices;
    setup_.add(verticesEntry, vertices);
    rows_.emplace(part_, std::vector<RecordedRows::Array>{{pointsFile, {"<f4", {frames_, vertices, 3}}}});
}

std::size_t GrowingCache::goOn() {
    // how many vertices there are is not known before a frame is evaluated: as many as there were
    const std::optional<Setup> earlier = Setup::read(part_ / setupFile);
    const std::size_t vertices = earlier ? numberFrom(earlier->value(verticesEntry).value_or("")) : 0;
    Setup expected = setup_;
    if (earlier)
        expected.add(verticesEntry, earlier->value(verticesEntry).value_or("0"));
    const Begun begun = begunWith(expected, part_, replaces_);
    if (begun == Begun::no)
        return 0;
    const Setup own = setup_;
    open(vertices);
    if (quarn::goOn(*rows_, begun, part_, console_))
        return rows_->rows();
    rows_.reset();
    setup_ = own;
    return 0;
}

void GrowingCache::beginAgain(const std::string& why) {
    console_.note(part_.string() + " cannot be gone on from (" + why + "): beginning again");
    rows_.reset();
    setup_ = setup_.without(verticesEntry);
}

std::vector<float> GrowingCache::points(std::size_t row) const {
    std::vector<float> xyz(3 * vertices_);
    rows_->read(0, row, std::as_writable_bytes(std::span(xyz)));
    return xyz;
}

void GrowingCache::append(std::span<const float> xyz) {
    if (!rows_) {
        open(xyz.size() / 3);
        discard();
        storage::writeWhole(part_ / setupFile, setup_.json());
        rows_->begin();
    }
    rows_->append({std::as_bytes(xyz)});
}

void GrowingCache::keep() {
    if (!rows_ || keepRows(*rows_, part_, console_))
        return;
    rows_.reset();
    discard();
}

void GrowingCache::publish() {
    rows_->publish(0, file_);
    rows_.reset();
    discard();
}

void GrowingCache::requireOursOnly() const {
    for (const fs::directory_entry& entry : fs::directory_iterator(part_))
        if (!isOurs(entry.path()))
            throw std::runtime_error(entry.path().string() + " is no part of a point cache that is being made, and " +
                                     part_.string() + " is needed for one; move it, or choose another place with -o");
}

// all but the lock, which goes with its owner
void GrowingCache::discard() {
    std::vector<fs::path> left;
    for (const fs::directory_entry& entry : fs::directory_iterator(part_))
        if (entry.path().filename() != storage::FolderLock::fileName && isOurs(entry.path()))
            left.push_back(entry.path());
    std::error_code error; // what cannot be removed is found to be of no use by the next run
    for (const fs::path& path : left)
        fs::remove_all(path, error);
}

} // namespace quarn
