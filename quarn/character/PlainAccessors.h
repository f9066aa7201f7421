// SPDX-License-Identifier: Apache-2.0
// New accessors for a glTF document, of plain values.
#pragma once

#include "quarn/character/GltfBytes.h"

#include <map>
#include <string>
#include <utility>

namespace quarn {

/// Collects values in one buffer of its own, behind those that there are. Thread: one.
class PlainAccessors {
public:
    /// Both must live as long. The document has passed checkGltf().
    PlainAccessors(storage::JsonDocument& document, GltfBytes& bytes);

    /// `index` is a valid index of an accessor. When the importer would not read it as it is, makes it that of a new
    /// one with the same values, as floats or, with `whole`, in its own type. Throws std::runtime_error with the reason
    /// when the values are not there or damaged.
    void makePlain(JsonValue& index, bool whole);

    /// A new accessor: its index. `bytes` has `count` elements, one after the other.
    unsigned add(const char* type, std::uint64_t componentType, std::uint64_t count, const std::string& bytes);

    /// Adds the buffer, if there is anything in it. To be called last, once.
    void finish();

private:
    unsigned changed(std::size_t index, bool whole);

    storage::JsonDocument& document_;
    GltfBytes& bytes_;
    unsigned buffer_; ///< its index
    std::string data_;
    std::map<std::pair<std::size_t, bool>, unsigned> done_;
};

} // namespace quarn
