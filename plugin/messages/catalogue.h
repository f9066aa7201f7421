// SPDX-License-Identifier: Apache-2.0
// The message catalogue: every text that the plug-in shows to people.
#pragma once

#include "openquarn/HStatus.h"
#include "openquarn/HStringResourceId.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>

namespace neuralWarp {

/// The texts, named as their keys. texts.def is the one list that everything here is made from.
enum class Text : std::size_t {
#define REGISTERED(key, text) key,
#define RAISED_ONLY(key, text) key,
#include "texts.def"
#undef REGISTERED
#undef RAISED_ONLY
};

struct CatalogueEntry {
    const char* key;
    const char* text; ///< with its placeholders
    bool isRegistered;
};

inline constexpr std::array catalogue = {
#define REGISTERED(key, text) CatalogueEntry{#key, text, true},
#define RAISED_ONLY(key, text) CatalogueEntry{#key, text, false},
#include "texts.def"
#undef REGISTERED
#undef RAISED_ONLY
};

constexpr const CatalogueEntry& entryOf(Text text) {
    return catalogue[static_cast<std::size_t>(text)];
}

/// Number of arguments that a text takes: the highest N of its placeholders ^Ns.
constexpr std::size_t argumentCount(std::string_view text) {
    std::size_t count = 0;
    for (std::size_t i = 0; i + 2 < text.size(); ++i)
        if (text[i] == '^' && text[i + 1] >= '1' && text[i + 1] <= '9' && text[i + 2] == 's')
            count = std::max(count, static_cast<std::size_t>(text[i + 1] - '0'));
    return count;
}

/// The id of a text: plug-in id "neuralWarp", key, default text. [any]
HStringResourceId idOf(Text text);

/// Gives the registered texts to the host, in their order, and succeeds: a text that the host refuses is shown as its
/// default. For HFnPlugin::registerUIStrings. [main]
HStatus registerCatalogue();

} // namespace neuralWarp
