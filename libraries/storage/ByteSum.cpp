// SPDX-License-Identifier: Apache-2.0
#include "storage/ByteSum.h"

#define XXH_INLINE_ALL // of the library, its header is enough
#include <xxhash.h>

namespace storage {

struct ByteSum::State {
    XXH3_state_t hash; // which has to lie at multiples of 64 bytes, as its type says
};

ByteSum::ByteSum()
    : state_(std::make_unique<State>()) {
    XXH3_128bits_reset(&state_->hash);
}

ByteSum::~ByteSum() = default;

void ByteSum::add(std::span<const std::byte> bytes) {
    XXH3_128bits_update(&state_->hash, bytes.data(), bytes.size());
}

std::string ByteSum::digits() const {
    XXH128_canonical_t canonical;
    XXH128_canonicalFromHash(&canonical, XXH3_128bits_digest(&state_->hash));
    std::string digits;
    for (const unsigned char byte : canonical.digest)
        digits += {"0123456789abcdef"[byte >> 4U], "0123456789abcdef"[byte & 15U]};
    return digits;
}

} // namespace storage
