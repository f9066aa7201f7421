// SPDX-License-Identifier: Apache-2.0
#include "storage/CacheFormat.h"

#include <string>
#include <utility>

namespace storage {

std::optional<CacheFormat> cacheFormatOf(const std::filesystem::path& path) {
    std::string ending = path.extension().string();
    for (char& letter : ending)
        if (letter >= 'A' && letter <= 'Z') // whatever the user's locale
            letter = static_cast<char>(letter - 'A' + 'a');
    constexpr std::pair<const char*, CacheFormat> rows[] = {{".npy", CacheFormat::npy},
                                                            {".npz", CacheFormat::npz},
                                                            {".pc2", CacheFormat::pc2},
                                                            {".mdd", CacheFormat::mdd},
                                                            {".obj", CacheFormat::obj}};
    for (const auto& [known, format] : rows)
        if (ending == known)
            return format;
    return std::nullopt;
}

} // namespace storage
