// SPDX-License-Identifier: Apache-2.0
// What a page calls. Pointers are offsets into the memory, and hold until the next call; what is not there is 0. A call
// that traps has kept its text, which nw_error() gives; a page is done then with this instance.
#include "lastError.h"
#include "openCharacter.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <span>
#include <string>
#include <string_view>

#define NW_EXPORT(name) extern "C" __attribute__((export_name(#name)))

namespace {

using viewer::Shape;

/// The one character of the page.
struct Page {
    viewer::Blocks blocks;
    std::unique_ptr<viewer::Character> character;
};

Page& page() {
    static Page only;
    return only;
}

/// The one that is open, when it has this frame: what a page can ask for wrongly is answered, and does not trap.
viewer::Character* characterWith(std::size_t frame) {
    viewer::Character* const open = viewer::openCharacter();
    if (!open || frame < open->frameCount())
        return open;
    viewer::keepError(("frame " + std::to_string(frame) + " is none of " + std::to_string(open->frameCount())).c_str());
    return nullptr;
}

bool areFinite(std::span<const double> values) {
    const bool are = std::all_of(values.begin(), values.end(), [](double value) { return std::isfinite(value); });
    if (!are)
        viewer::keepError("the value of a slider is not finite");
    return are;
}

/// The array that `pick` gives of the character; null for an empty one.
template <class Pick>
const void* arrayOf(const Pick& pick) {
    const viewer::Character* const open = viewer::openCharacter();
    return open && !pick(*open).empty() ? pick(*open).data() : nullptr;
}

std::size_t countOf(const viewer::Character& open, std::uint32_t what) {
    switch (what) {
    case 0:
        return open.vertexCount();
    case 1:
        return open.drawVertexCount();
    case 2:
        return open.triangles().size() / 3;
    case 3:
        return open.frameCount();
    case 4:
        return open.sliderCount();
    case 5:
        return open.controlCount();
    case 6:
        return open.checkCount();
    case 7:
        return open.hasTarget() ? 1 : 0;
    case 8:
        return open.hasErrors() ? 1 : 0;
    case 9:
        return open.hasRig() ? 1 : 0;
    default:
        return 0;
    }
}

} // namespace

viewer::Character* viewer::openCharacter() {
    if (!page().character)
        keepError("no character is open");
    return page().character.get();
}

NW_EXPORT(nw_allocate) void* nw_allocate(std::size_t bytes) {
    return operator new(bytes);
}

NW_EXPORT(nw_release) void nw_release(void* memory) {
    operator delete(memory);
}

NW_EXPORT(nw_add_block)
void nw_add_block(const char* name, std::size_t nameLength, const std::byte* bytes, std::size_t size) {
    std::shared_ptr<const std::byte> owned(bytes, [](const std::byte* memory) {
        nw_release(const_cast<std::byte*>(memory)); // NOLINT(cppcoreguidelines-pro-type-const-cast): it is given up
    });
    page().blocks.add(std::string(name, nameLength), std::move(owned), size);
}

NW_EXPORT(nw_block_sum) std::uint64_t nw_block_sum(const char* name, std::size_t nameLength) {
    const std::string_view block(name, nameLength);
    return page().blocks.has(block) ? page().blocks.sum(block) : 0;
}

NW_EXPORT(nw_open) std::uint32_t nw_open() {
    page().character = std::make_unique<viewer::Character>(page().blocks);
    page().blocks.forgetBytes();
    return 1;
}

NW_EXPORT(nw_error) const char* nw_error() {
    return viewer::lastError();
}

NW_EXPORT(nw_count) std::size_t nw_count(std::uint32_t what) {
    const viewer::Character* const open = viewer::openCharacter();
    return open ? countOf(*open, what) : 0;
}

NW_EXPORT(nw_show_frame) std::uint32_t nw_show_frame(std::size_t frame) {
    viewer::Character* const open = characterWith(frame);
    if (open)
        open->showFrame(frame);
    return open ? 1 : 0;
}

NW_EXPORT(nw_show_sliders) std::uint32_t nw_show_sliders(std::size_t frame, const double* values) {
    viewer::Character* const open = characterWith(frame);
    if (!open || !open->hasRig() || !areFinite({values, open->sliderCount()}))
        return 0;
    open->showSliders(frame, {values, open->sliderCount()});
    return 1;
}

NW_EXPORT(nw_set_envelope) void nw_set_envelope(float factor) {
    viewer::Character* const open = viewer::openCharacter();
    if (open && std::isfinite(factor))
        open->setEnvelope(factor);
}

NW_EXPORT(nw_triangles) const void* nw_triangles() {
    return arrayOf([](const viewer::Character& open) { return open.triangles(); });
}

NW_EXPORT(nw_points) const void* nw_points(Shape shape) {
    return arrayOf([=](const viewer::Character& open) { return open.points(shape); });
}

NW_EXPORT(nw_draw_points) const void* nw_draw_points(Shape shape) {
    return arrayOf([=](const viewer::Character& open) { return open.drawPoints(shape); });
}

NW_EXPORT(nw_draw_normals) const void* nw_draw_normals(Shape shape) {
    return arrayOf([=](const viewer::Character& open) { return open.drawNormals(shape); });
}

NW_EXPORT(nw_errors) const void* nw_errors(Shape shape) {
    return arrayOf([=](const viewer::Character& open) { return open.errors(shape); });
}

NW_EXPORT(nw_draw_errors) const void* nw_draw_errors(Shape shape) {
    return arrayOf([=](const viewer::Character& open) { return open.drawErrors(shape); });
}

NW_EXPORT(nw_controls) const void* nw_controls() {
    return arrayOf([](const viewer::Character& open) { return open.controls(); });
}

NW_EXPORT(nw_sum) std::uint64_t nw_sum() {
    const viewer::Character* const open = viewer::openCharacter();
    return open ? open->sum() : 0;
}

NW_EXPORT(nw_check) std::uint32_t nw_check(std::size_t number) {
    viewer::Character* const open = viewer::openCharacter();
    return open && number < open->checkCount() && open->check(number) ? 1 : 0;
}
