// SPDX-License-Identifier: Apache-2.0
#include "storage/fileSum.h"

#include "storage/openToRead.h"

#include <algorithm>
#include <cerrno>
#include <memory>
#include <new>
#include <span>
#include <vector>

#define XXH_INLINE_ALL // of the library, its header is enough
#include <xxhash.h>

namespace storage {
namespace {

using State = std::unique_ptr<XXH3_state_t, decltype(&XXH3_freeState)>;

State newState() {
    State state(XXH3_createState(), &XXH3_freeState);
    if (!state)
        throw std::bad_alloc();
    XXH3_128bits_reset(state.get());
    return state;
}

std::string digitsOf(const XXH128_hash_t& hash) {
    XXH128_canonical_t canonical;
    XXH128_canonicalFromHash(&canonical, hash);
    std::string digits;
    for (const unsigned char byte : canonical.digest)
        digits += {"0123456789abcdef"[byte >> 4U], "0123456789abcdef"[byte & 15U]};
    return digits;
}

} // namespace

FileSum sumOfFile(const std::filesystem::path& path, std::uint64_t most, std::size_t headSize) {
    constexpr std::size_t blockSize = 1U << 18U; // stays in the second cache between reading and adding
    const OpenFile file = openToRead(path, most);
    const State state = newState();
    std::vector<std::byte> block(std::max<std::size_t>(std::min<std::uint64_t>(blockSize, file.size + 1), headSize));
    FileSum sum;
    for (std::uint64_t done = 0;;) {
        const std::ptrdiff_t got = readAt(file.descriptor.number(), done, block);
        if (got < 0)
            failToRead(path, errno);
        const auto size = static_cast<std::size_t>(got);
        if (done == 0)
            sum.head.assign(reinterpret_cast<const char*>(block.data()), std::min(size, headSize));
        XXH3_128bits_update(state.get(), block.data(), size);
        done += size;
        if (done > most)
            refuseSize(path, "more than " + std::to_string(most), most);
        if (size < block.size())
            break;
    }
    sum.digits = digitsOf(XXH3_128bits_digest(state.get()));
    return sum;
}

} // namespace storage
