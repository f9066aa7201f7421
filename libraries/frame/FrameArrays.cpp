// SPDX-License-Identifier: Apache-2.0
#include "frame/FrameArrays.h"

#include <mutex>
#include <utility>
#include <vector>

namespace neuralWarp {
namespace {

template <class T>
std::size_t bytesOf(const std::vector<T>& values) {
    return values.capacity() * sizeof(T);
}

// What no frame uses; the last that came is the next that goes.
class FreeArrays {
public:
    std::unique_ptr<FrameArrays> take() {
        const std::scoped_lock lock(mutex_);
        if (free_.empty()) {
            free_.reserve(++count_); // so that giving back never allocates
            return std::make_unique<FrameArrays>();
        }
        std::unique_ptr<FrameArrays> arrays = std::move(free_.back());
        free_.pop_back();
        return arrays;
    }
    void giveBack(std::unique_ptr<FrameArrays> arrays) {
        const std::scoped_lock lock(mutex_);
        free_.push_back(std::move(arrays));
    }

private:
    std::mutex mutex_;
    std::vector<std::unique_ptr<FrameArrays>> free_;
    std::size_t count_ = 0; // of all, the lent ones too
};

FreeArrays& freeArrays() {
    static FreeArrays arrays;
    return arrays;
}

} // namespace

std::size_t FrameArrays::bytes() const {
    return bytesOf(points) + bytesOf(deltas) + bytesOf(slotDeltas) + bytesOf(result) + bytesOf(smoothed) +
           bytesOf(scratch.a) + bytesOf(scratch.b);
}

LentArrays::LentArrays(FrameArrays& to)
    : to_(to)
    , lent_(freeArrays().take()) {
    std::swap(to_, *lent_);
}

LentArrays::~LentArrays() {
    std::swap(to_, *lent_);
    freeArrays().giveBack(std::move(lent_));
}

} // namespace neuralWarp
