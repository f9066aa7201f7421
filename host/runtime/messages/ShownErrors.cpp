// SPDX-License-Identifier: Apache-2.0
#include "messages/ShownErrors.h"

#include <mutex>

namespace OpenQuarn {
namespace {

struct Innermost {
    std::mutex mutex;
    ShownErrors* one = nullptr;
};

Innermost& innermost() {
    static Innermost theInnermost;
    return theInnermost;
}

} // namespace

ShownErrors::ShownErrors() {
    const std::scoped_lock lock(innermost().mutex);
    outer_ = innermost().one;
    innermost().one = this;
}

ShownErrors::~ShownErrors() {
    const std::scoped_lock lock(innermost().mutex);
    innermost().one = outer_;
    if (outer_ && outer_->first_.empty())
        outer_->first_.swap(first_);
}

std::string ShownErrors::first() const {
    const std::scoped_lock lock(innermost().mutex);
    return first_;
}

void ShownErrors::forget() {
    const std::scoped_lock lock(innermost().mutex);
    first_.clear();
}

void ShownErrors::note(const std::string& text) {
    const std::scoped_lock lock(innermost().mutex);
    if (ShownErrors* one = innermost().one; one && one->first_.empty())
        one->first_ = text.empty() ? "(without a text)" : text;
}

} // namespace OpenQuarn
