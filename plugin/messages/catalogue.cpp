// SPDX-License-Identifier: Apache-2.0
#include "messages/catalogue.h"

#include "openquarn/HStringResource.h"

namespace neuralWarp {
namespace {

HStringResourceId idOf(const CatalogueEntry& entry) {
    return {"neuralWarp", entry.key, entry.text};
}

} // namespace

HStringResourceId idOf(Text text) {
    return idOf(entryOf(text));
}

HStatus registerCatalogue() {
    for (const CatalogueEntry& entry : catalogue)
        if (entry.isRegistered)
            HStringResource::registerString(idOf(entry));
    return HStatus::kSuccess;
}

} // namespace neuralWarp
