// SPDX-License-Identifier: Apache-2.0
#include "geometry/Positions.h"

#include "quill/largePages.h"

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <new>
#include <utility>

namespace OpenQuarn {
namespace {

std::uint64_t nextVersion() {
    static std::atomic<std::uint64_t> last{0};
    return last.fetch_add(1, std::memory_order_relaxed) + 1;
}

PositionBuffer uninitialised(std::size_t vertexCount) {
    constexpr std::size_t largePage = std::size_t{2} << 20U;
    const std::size_t bytes = 3 * vertexCount * sizeof(double);
    void* memory = nullptr;
    if (bytes > 0 && posix_memalign(&memory, bytes < largePage ? alignof(std::max_align_t) : largePage, bytes) != 0)
        throw std::bad_alloc();
    quill::adviseLargePages(memory, bytes);
    return PositionBuffer(static_cast<double*>(memory));
}

} // namespace

void FreeMemory::operator()(double* memory) const noexcept {
    std::free(memory); // it comes from posix_memalign
}

Positions::Positions(std::size_t vertexCount, PositionBuffer buffer, std::weak_ptr<PositionPool> pool)
    : vertexCount_(vertexCount)
    , version_(nextVersion())
    , xyz_(std::move(buffer))
    , pool_(std::move(pool)) {}

Positions::~Positions() {
    if (const std::shared_ptr<PositionPool> pool = pool_.lock())
        pool->giveBack(std::move(xyz_), vertexCount_);
}

bool Positions::sameAs(const Positions& other) const {
    if (version_ == other.version_)
        return true;
    return vertexCount_ == other.vertexCount_ &&
           (vertexCount_ == 0 || std::memcmp(xyz(), other.xyz(), 3 * vertexCount_ * sizeof(double)) == 0);
}

std::shared_ptr<Positions> PositionPool::take(std::size_t vertexCount) {
    PositionBuffer buffer;
    {
        const std::scoped_lock lock(mutex_);
        if (spareCount_ == vertexCount)
            buffer = std::move(spare_);
        spare_.reset();
        spareCount_ = 0;
    }
    if (!buffer)
        buffer = uninitialised(vertexCount);
    return std::make_shared<Positions>(vertexCount, std::move(buffer), weak_from_this());
}

void PositionPool::giveBack(PositionBuffer buffer, std::size_t vertexCount) noexcept {
    const std::scoped_lock lock(mutex_);
    spare_.swap(buffer);
    spareCount_ = vertexCount;
}

std::shared_ptr<Positions> newPositions(std::size_t vertexCount) {
    return std::make_shared<Positions>(vertexCount, uninitialised(vertexCount), std::weak_ptr<PositionPool>());
}

} // namespace OpenQuarn
