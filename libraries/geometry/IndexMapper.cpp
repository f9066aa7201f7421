// SPDX-License-Identifier: Apache-2.0
#include "quill/IndexMapper.h"

#include <utility>

namespace quill {

void IndexMapper::setIdentity(std::size_t fullCount) {
    identity_ = true;
    fullCount_ = fullCount;
    affectedToFull_.clear();
    fullToAffected_.clear();
}

void IndexMapper::set(std::vector<std::uint32_t> affectedToFull, std::size_t fullCount) {
    identity_ = false;
    fullCount_ = fullCount;
    affectedToFull_ = std::move(affectedToFull);
    fullToAffected_.clear();
}

void IndexMapper::buildFullToAffected() const {
    fullToAffected_.assign(fullCount_, missingIndex);
    for (std::size_t k = 0; k < affectedToFull_.size(); ++k)
        if (affectedToFull_[k] < fullCount_)
            fullToAffected_[affectedToFull_[k]] = static_cast<std::uint32_t>(k);
}

} // namespace quill
