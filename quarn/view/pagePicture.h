// SPDX-License-Identifier: Apache-2.0
// Pictures as a page takes them in.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace quarn {

/// The bytes of a picture file.
struct PageTexture {
    std::string mime; ///< "image/png" or "image/jpeg"
    std::string bytes;
    std::uint32_t width = 0, height = 0; ///< pixels
};

/// A PNG or JPEG picture, made smaller where a side has more than `mostPixels` (above 0), with its proportions. JPEG
/// stays as it is where it fits; what has no alpha to be kept (`keepsAlpha`) becomes JPEG where that takes much less.
/// `bytes` may be anything: throws std::runtime_error with the reason, as in "is damaged: bad PNG sig". The decoder is
/// not hardened: to be called where a crash does no harm. Thread: any.
PageTexture pagePicture(std::string_view bytes, std::uint32_t mostPixels, bool keepsAlpha);

} // namespace quarn
