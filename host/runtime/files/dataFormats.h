// SPDX-License-Identifier: Apache-2.0
// How each kind of data stands in a scene file. A new kind is a row in dataFormats.cpp.
#pragma once

#include "files/json.h"
#include "types/Attribute.h"
#include "types/Data.h"

#include <memory>
#include <string>
#include <vector>

namespace OpenQuarn {

/// True when the data can be written. Data of a plug-in that does not say how to write itself cannot; where it says
/// that it failed, `why` is filled in. `text` receives what a plug-in wrote, for writeData().
bool preparePluginData(const Data& data, std::string& text, std::string& why);

/// Writes the value; `text` as preparePluginData() gave it.
void writeData(JsonWriter& writer, const Data& data, const std::string& text);

/// The data that the value stands for, of the attribute's kind. Null with a reason in `why` when it does not fit.
std::shared_ptr<Data> readData(const Attribute& attribute, const storage::JsonValue& value, std::string& why);

/// The keys that readData() understands in a value that is an object.
const std::vector<std::string>& knownDataKeys(HFnData::Type type);

} // namespace OpenQuarn
